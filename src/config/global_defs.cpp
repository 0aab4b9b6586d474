#include "config/global_defs.h"

#include <algorithm>
#include <utility>

#include "platform/config_store.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

std::string WithSlash(std::string path) {
  if (!path.empty() && path.back() != '/') path += '/';
  return path;
}

// The configured home with its "/", or empty.
std::string ConfiguredHome() {
  std::string home;
  platform::ReadConfigValue("home", home);
  return WithSlash(std::move(home));
}

bool HomeFolderOf(FolderKind kind, std::string_view& folder) {
  switch (kind) {
    case FolderKind::Home: folder = ""; return true;
    case FolderKind::HomeConfig: folder = "Config/"; return true;
    case FolderKind::System: folder = "System/"; return true;
    case FolderKind::Log: folder = "Log/"; return true;
    case FolderKind::Tasks: folder = "Tasks/"; return true;
    default: return false;
  }
}

// The folder below the group folder, or nullptr for kinds that are not in it.
const char* GroupSubfolder(FolderKind kind) {
  switch (kind) {
    case FolderKind::Group: return "";
    case FolderKind::Indexes: return "Indexes/";
    case FolderKind::Orders: return "Orders/";
    case FolderKind::GroupConfig: return "Config/";
    case FolderKind::Repositories:
    case FolderKind::Repositories2: return "Repositories/";
    case FolderKind::Definitions: return "Definitions/";
    case FolderKind::Queries: return "Queries/";
    case FolderKind::WorkData: return "WorkData/";
    case FolderKind::DataStore: return "DataStore/";
    default: return nullptr;
  }
}

[[noreturn]] void UnknownKind(FolderKind kind, const char* method) {
  throw CSTDFUNException::Text("Unknown folder kind: %i", method, nullptr,
                               static_cast<int32_t>(kind));
}

// A group names one folder below Groups/: never empty, never a path.
std::string GroupFolderName(const std::string& group) {
  if (group.empty() || group == "." || group == ".." ||
      group.find_first_of(std::string_view("/\0", 2)) != std::string::npos) {
    throw CSTDFUNException::Text("Invalid group name: %S", "GetFullDataPath", nullptr, group);
  }
  return ToUpper(std::string_view(group));
}

std::string ReplaceAll(std::string text, std::string_view what, std::string_view with) {
  std::size_t pos = 0;
  while ((pos = text.find(what, pos)) != std::string::npos) {
    text.replace(pos, what.size(), with);
    pos += with.size();
  }
  return text;
}

std::string ExpandEach(const CGlobalDefs& defs, std::string text,
                       std::initializer_list<std::pair<std::string_view, FolderKind>> table) {
  for (const auto& [placeholder, kind] : table) {
    if (text.find(placeholder) != std::string::npos) {
      text = ReplaceAll(std::move(text), placeholder, defs.GetFolder(kind));
    }
  }
  return text;
}

}  // namespace

// Each new settings object reads the trace level file again, so a changed
// level reaches the next engine without a restart.
CGlobalDefs::CGlobalDefs() { InitTraceLevels(); }

CGlobalDefs::CGlobalDefs(const CGlobalDefs& other) { *this = other; }

void CGlobalDefs::ResetProgress() {
  std::lock_guard lock(progress_mutex_);
  progress_ = 0;
}

void CGlobalDefs::SetProgress(int32_t percent) {
  std::lock_guard lock(progress_mutex_);
  progress_ = std::max(progress_, std::clamp(percent, 0, 100));
}

int32_t CGlobalDefs::GetProgress() const {
  std::lock_guard lock(progress_mutex_);
  return progress_;
}

CGlobalDefs& CGlobalDefs::operator=(const CGlobalDefs& other) {
  if (this == &other) return *this;
  std::scoped_lock lock(mutex_, other.mutex_);
  data_path_ = other.data_path_;
  connection_string_ = other.connection_string_;
  display_name_ = other.display_name_;
  group_ = other.group_;
  dsn_ = other.dsn_;
  user_id_ = other.user_id_;
  password_ = other.password_;
  mode_ = other.mode_;
  connection_set_ = other.connection_set_;
  return *this;
}

// --- folders ---

std::string CGlobalDefs::GetHomePath(FolderKind kind, bool placeholder) const {
  std::string_view folder;
  if (!HomeFolderOf(kind, folder)) UnknownKind(kind, "GetHomePath");
  const std::string home = placeholder ? std::string(kPlaceholderHome) : ConfiguredHome();
  if (home.empty()) return {};
  return home + std::string(folder);
}

std::string CGlobalDefs::GetHomePathRequired(FolderKind kind, const char* method) const {
  std::string path = GetHomePath(kind, false);
  if (path.empty()) throw CSTDFUNException::Text("Home path is not set", method, nullptr);
  return path;
}

std::string CGlobalDefs::GetFullDataPath(FolderKind kind, bool placeholder) const {
  std::string root;
  std::string group;
  {
    std::lock_guard lock(mutex_);
    root = data_path_;
    group = group_;
  }
  if (root.empty()) {
    if (placeholder) {
      root = std::string(kPlaceholderHome) + "Data/";
    } else {
      platform::ReadConfigValue("path", root);
    }
  }
  if (root.empty()) throw CSTDFUNException::Text("Data path is not set", "GetFullDataPath", nullptr);
  root = WithSlash(std::move(root));

  switch (kind) {
    case FolderKind::Data: return root;
    case FolderKind::Language: return root + "Language/";
    case FolderKind::Converters: return root + "Converters/";
    case FolderKind::Groups: return root + "Groups/";
    default: break;
  }
  const char* sub = GroupSubfolder(kind);
  if (sub == nullptr) UnknownKind(kind, "GetFullDataPath");
  return root + "Groups/" + GroupFolderName(group) + "/" + sub;
}

std::string CGlobalDefs::GetFolder(FolderKind kind, bool placeholder) const {
  std::string_view unused;
  if (HomeFolderOf(kind, unused)) return GetHomePath(kind, placeholder);
  switch (kind) {
    case FolderKind::Data:
    case FolderKind::Language:
    case FolderKind::Converters:
    case FolderKind::Groups:
      return GetFullDataPath(kind, placeholder);
    default:
      if (GroupSubfolder(kind) != nullptr) return GetFullDataPath(kind, placeholder);
  }
  UnknownKind(kind, "GetFolder");
}

std::string CGlobalDefs::ExpandPlaceholders(std::string_view text) const {
  return ExpandEach(*this, std::string(text),
                    {{kPlaceholderHome, FolderKind::Home},
                     {kPlaceholderConfig, FolderKind::HomeConfig},
                     {kPlaceholderData, FolderKind::Data},
                     {kPlaceholderDataGroup, FolderKind::Groups},
                     {kPlaceholderDataConverters, FolderKind::Converters},
                     {kPlaceholderDataStore, FolderKind::DataStore}});
}

std::string CGlobalDefs::ExpandHomePlaceholders(std::string_view text) const {
  return ExpandEach(*this, std::string(text),
                    {{kPlaceholderHome, FolderKind::Home},
                     {kPlaceholderConfig, FolderKind::HomeConfig}});
}

std::string CGlobalDefs::CollapseDataPath(std::string_view text) const {
  return ReplaceAll(std::string(text), GetFullDataPath(FolderKind::Data), kPlaceholderData);
}

// --- data path and group ---

void CGlobalDefs::SetDataPath(std::string_view path) {
  std::lock_guard lock(mutex_);
  data_path_ = path;
}

std::string CGlobalDefs::GetDataPath() const {
  std::lock_guard lock(mutex_);
  return data_path_;
}

std::string CGlobalDefs::GetLockScope() const {
  std::string root = GetDataPath();
  if (root.empty()) platform::ReadConfigValue("path", root);
  return root;
}

void CGlobalDefs::SetGroup(std::string_view group) {
  std::lock_guard lock(mutex_);
  group_ = group;
}

std::string CGlobalDefs::GetGroup() const {
  std::lock_guard lock(mutex_);
  return group_;
}

// --- connection ---

void CGlobalDefs::SetConnectionDsn(std::string_view dsn, std::string_view user,
                                   std::string_view password) {
  {
    std::lock_guard lock(mutex_);
    dsn_ = dsn;
    user_id_ = user;
    password_ = password;
    mode_ = ConnectionMode::Dsn;
    connection_set_ = true;
  }
  Trace(TraceLevel1(), "PILIB,FILIB.(SHARELIB)CGlobalDefs.set_connection", "Connection set: DSN; %s",
        dsn);
}

void CGlobalDefs::SetConnectionString(std::string_view text, std::string_view display_name) {
  if (text.empty()) return;
  std::lock_guard lock(mutex_);
  connection_string_ = text;
  display_name_ = display_name;
  mode_ = ConnectionMode::ConnectionString;
  connection_set_ = true;
}

void CGlobalDefs::SetConnection(std::string_view text, std::string_view display_name) {
  const std::string upper = AsciiUpper(text);
  if (upper == "DEFAULT") {
    // The embedded default data source: a SQLite file in the group's DataStore.
    SetConnectionString("Driver=SQLite3;Database=" + GetFullDataPath(FolderKind::DataStore) +
                            "Default.db;StepAPI=1;",
                        display_name);
  } else if (upper == "SQL_GROUP_DEFAULT") {
    LoadGroupConnection();
  } else {
    SetConnectionString(text, display_name);
  }
}

std::string CGlobalDefs::GetConnectionString() const {
  std::lock_guard lock(mutex_);
  if (mode_ == ConnectionMode::ConnectionString) return connection_string_;
  return "DSN=" + dsn_ + ";UID=" + user_id_ + ";PWD=" + password_ + ";";
}

std::string CGlobalDefs::DisplayNameOf(std::string_view connection_string) {
  const std::string upper = ToUpper(connection_string);
  for (std::string_view key : {"DSN=", "DB="}) {
    const auto at = upper.find(key);
    if (at == std::string::npos) continue;
    const auto start = at + key.size();
    const auto end = upper.find(';', start);
    return upper.substr(start, end == std::string::npos ? std::string::npos : end - start);
  }
  return "No Display Name";
}

std::string CGlobalDefs::GetDisplayName() const {
  std::lock_guard lock(mutex_);
  if (mode_ == ConnectionMode::Dsn) return dsn_;
  if (!display_name_.empty()) return display_name_;
  return DisplayNameOf(connection_string_);
}

void CGlobalDefs::LoadGroupConnection() {
  const std::string path = GetFullDataPath(FolderKind::GroupConfig) + "dbc.dat";
  std::string text;
  if (!platform::ReadWholeFile(path, text)) return;
  // The stored text ends at its terminator, if the tool that wrote it kept one.
  text.resize(text.find('\0') == std::string::npos ? text.size() : text.find('\0'));
  ScrambleConnectionText(text);
  SetConnectionString(text, GetGroup());
}

ConnectionMode CGlobalDefs::GetConnectionMode() const {
  std::lock_guard lock(mutex_);
  return mode_;
}

bool CGlobalDefs::IsConnectionSet() const {
  std::lock_guard lock(mutex_);
  return connection_set_;
}

std::string CGlobalDefs::GetDsn() const {
  std::lock_guard lock(mutex_);
  return dsn_;
}

std::string CGlobalDefs::GetUserId() const {
  std::lock_guard lock(mutex_);
  return user_id_;
}

std::string CGlobalDefs::GetPassword() const {
  std::lock_guard lock(mutex_);
  return password_;
}

}  // namespace qm
