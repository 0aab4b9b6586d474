#include "host_session.h"

#include <cstdio>
#include <utility>

#include "index/findex_file_set.h"
#include "index/order_file_set.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "terminal_text.h"

namespace qm::cli {

namespace {

// A connection-string value: braced when it holds a character that would end
// or open one, with "}" doubled inside.
std::string ConnectionValue(std::string_view value) {
  const bool blank_at_end = !value.empty() && (value.front() == ' ' || value.back() == ' ');
  if (value.find_first_of(";{}") == std::string_view::npos && !blank_at_end) {
    return std::string(value);
  }
  std::string out = "{";
  for (char c : value) {
    out += c;
    if (c == '}') out += '}';
  }
  return out + "}";
}

}  // namespace

std::string DsnConnectionString(std::string_view dsn, std::string_view user,
                                std::string_view password) {
  return "DSN=" + ConnectionValue(dsn) + ";UID=" + ConnectionValue(user) +
         ";PWD=" + ConnectionValue(password) + ";";
}

const BSTR* HostSession::Text(std::string_view utf8) {
  texts_.push_back(Utf8ToUtf16(utf8));
  return &texts_.back();
}

bool HostSession::Open(const GlobalOptions& options) {
  command_ = std::make_unique<APICommand>();
  if (!options.data_dir.empty() && command_->SetDataPath(Text(options.data_dir)) != S_OK) {
    return Fail(), false;
  }
  if (!options.group.empty() && command_->SetGroup(Text(options.group)) != S_OK) {
    return Fail(), false;
  }
  if (!options.connect.empty()) {
    if (command_->SetDBConnectionString(Text(options.connect)) != S_OK) return Fail(), false;
  } else if (!options.dsn.empty()) {
    // Stored without a test, as a connection string: commands that need no
    // data source still run when it is away.
    const std::string text = DsnConnectionString(options.dsn, options.user, options.password);
    if (command_->SetDBConnectionStringEx(Text(text), Text(options.dsn)) != S_OK) {
      return Fail(), false;
    }
  }
  if (command_->LoadDefaultIndexOptions() != S_OK || command_->LoadDefaultOrderOptions() != S_OK) {
    return Fail(), false;
  }
  return SetUpDefs(options);
}

bool HostSession::OpenSearch(const GlobalOptions& options) {
  search_ = std::make_unique<APISearch>();
  if (!options.data_dir.empty() && search_->SetDataPath(Text(options.data_dir)) != S_OK) {
    return Fail(), false;
  }
  if (!options.group.empty() && search_->SetGroup(Text(options.group)) != S_OK) {
    return Fail(), false;
  }
  return SetUpDefs(options);
}

bool HostSession::SetUpDefs(const GlobalOptions& options) {
  group_ = options.group.empty() ? "PUBLIC" : options.group;
  try {
    if (!options.data_dir.empty()) defs_.SetDataPath(options.data_dir);
    defs_.SetGroup(group_);
  } catch (const CExceptionBase& e) {
    return Fail(TerminalText(e)), false;
  }
  return true;
}

std::string HostSession::Group() const { return group_; }

bool HostSession::Require(bool there, std::string_view what, std::string_view name) {
  if (there) return true;
  Fail("no " + std::string(what) + " " + std::string(name) + " in group " + group_);
  return false;
}

namespace {

// False also when the folders cannot be resolved or read: a data directory
// that was never initialised, or one this user cannot read.
template <class Look>
bool Looks(Look&& look) {
  try {
    return look();
  } catch (const CExceptionBase&) {
    return false;
  }
}

}  // namespace

bool HostSession::RequireFindex(std::string_view name) {
  return Require(Looks([&] { return !findex::ExistingFiles(defs_, name).empty(); }), "findex",
                 name);
}

bool HostSession::RequireOrder(std::string_view name) {
  return Require(Looks([&] {
                   const order_files::OrderPaths paths = order_files::PathsOf(defs_, name);
                   return platform::FileExists(paths.sri) || platform::FileExists(paths.srt);
                 }),
                 "order", name);
}

int HostSession::Fail() {
  ErrorInfo info;
  return Fail(GetErrorInfo(info) ? Utf16ToUtf8(info.Description) : "unknown failure");
}

int HostSession::Fail(std::string text) {
  text = TerminalLines(std::move(text));
  if (text.empty() || text.back() != '\n') text += '\n';
  std::fprintf(stderr, "quillmere %s: %s", name_.c_str(), text.c_str());
  return kExitError;
}

int HostSession::Usage(std::string_view message, std::string_view usage) {
  std::fprintf(stderr, "quillmere %s: %.*s\nusage: quillmere %.*s\n", name_.c_str(),
               static_cast<int>(message.size()), message.data(), static_cast<int>(usage.size()),
               usage.data());
  return kExitUsage;
}

std::optional<int> HostSession::TakeArguments(const std::vector<std::string>& args,
                                              std::initializer_list<std::string_view> with_value,
                                              std::initializer_list<std::string_view> flags,
                                              std::string_view usage, void (*print_help)(),
                                              ArgumentList& list) {
  const std::string error = SplitArguments(args, with_value, flags, list);
  if (!error.empty()) return Usage(error, usage);
  if (list.help) {
    print_help();
    return kExitOk;
  }
  return std::nullopt;
}

}  // namespace qm::cli
