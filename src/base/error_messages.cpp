#include "base/error_messages.h"

#include <mutex>
#include <shared_mutex>

#include "platform/config_store.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/shipped_data.h"

namespace qm {

namespace {

constexpr std::size_t kMaxLineUnits = 2048;
constexpr std::size_t kMaxTextUnits = 2047;

struct Table {
  std::shared_mutex mutex;
  std::map<int32_t, ErrorEntry> entries;
};

// Filled on first use, which stands for "when the library is loaded": no API
// object can exist before it.
Table& TheTable() {
  static Table table;
  static std::once_flag loaded;
  std::call_once(loaded, [] {
    std::string bytes;
    if (platform::ReadWholeFile(ErrorMessageFolder() + "mrvconf.ini", bytes)) {
      table.entries = ParseErrorMessages(bytes);
    }
  });
  return table;
}

bool StartsWith(std::u16string_view line, std::u16string_view prefix) {
  return line.substr(0, prefix.size()) == prefix;
}

// Reads a decimal field; returns false when it is missing or not a number.
bool ParseDecimal(std::u16string_view field, int32_t& out) {
  std::size_t i = 0;
  while (i < field.size() && (field[i] == u' ' || field[i] == u'\t')) ++i;
  bool negative = false;
  if (i < field.size() && (field[i] == u'-' || field[i] == u'+')) negative = field[i++] == u'-';
  long long value = 0;
  bool any = false;
  for (; i < field.size() && field[i] >= u'0' && field[i] <= u'9'; ++i) {
    value = value * 10 + (field[i] - u'0');
    if (value > 0x7fffffffLL) return false;
    any = true;
  }
  if (!any) return false;
  out = static_cast<int32_t>(negative ? -value : value);
  return true;
}

}  // namespace

std::map<int32_t, ErrorEntry> ParseErrorMessages(const std::string& bytes) {
  std::map<int32_t, ErrorEntry> table;
  // The file is UTF-16LE behind a byte-order mark; a file saved without the
  // mark loses nothing.
  const std::size_t start =
      bytes.size() >= 2 && bytes[0] == '\xFF' && bytes[1] == '\xFE' ? 2 : 0;
  std::u16string text;
  text.reserve(bytes.size() / 2);
  for (std::size_t i = start; i + 1 < bytes.size(); i += 2) {
    text.push_back(static_cast<char16_t>(static_cast<unsigned char>(bytes[i]) |
                                         (static_cast<unsigned char>(bytes[i + 1]) << 8)));
  }
  bool in_messages = false;
  std::size_t pos = 0;
  while (pos < text.size()) {
    std::size_t end = text.find(u'\n', pos);
    if (end == std::u16string::npos) end = text.size();
    std::u16string_view line(text.data() + pos, end - pos);
    pos = end + 1;
    line = line.substr(0, Utf16CutLength(line, kMaxLineUnits));

    if (StartsWith(line, u"[END]")) continue;
    if (!in_messages) {
      in_messages = StartsWith(line, u"[ERROR MESSAGES]");
      continue;
    }
    // number,level,text - the text runs to the line end and may hold commas.
    const auto c1 = line.find(u',');
    if (c1 == std::u16string_view::npos) break;
    const auto c2 = line.find(u',', c1 + 1);
    if (c2 == std::u16string_view::npos) break;
    int32_t number = 0;
    int32_t level = 0;
    if (!ParseDecimal(line.substr(0, c1), number) || number == 0) break;
    if (!ParseDecimal(line.substr(c1 + 1, c2 - c1 - 1), level) || level == 0) break;
    std::u16string_view message = line.substr(c2 + 1);
    message = message.substr(0, message.find(u'\r'));
    if (message.empty()) break;
    message = message.substr(0, Utf16CutLength(message, kMaxTextUnits));
    table.try_emplace(number, ErrorEntry{std::u16string(message), number, level});
  }
  return table;
}

std::string ErrorMessageFolder() {
  std::string system;
  if (platform::ReadConfigValue("system", system) == platform::ConfigStatus::Ok &&
      !system.empty()) {
    if (system.back() != '/') system += '/';
    return system;
  }
  return ShippedDataFolder("System/mrvconf.ini") + "System/";
}

void LoadErrorMessages() { LoadErrorMessagesFromFile(ErrorMessageFolder() + "mrvconf.ini"); }

bool LoadErrorMessagesFromFile(const std::string& path) {
  std::string bytes;
  const bool ok = platform::ReadWholeFile(path, bytes);
  auto parsed = ok ? ParseErrorMessages(bytes) : std::map<int32_t, ErrorEntry>{};
  Table& table = TheTable();
  std::unique_lock lock(table.mutex);
  table.entries = std::move(parsed);
  return ok;
}

ErrorEntry LookupErrorMessage(int32_t number) {
  Table& table = TheTable();
  std::shared_lock lock(table.mutex);
  const auto it = table.entries.find(number);
  if (it != table.entries.end()) return it->second;
  return {u"General Error (Module:%MODULE, Method:%METHOD)", number, kLevelGeneral};
}

}  // namespace qm
