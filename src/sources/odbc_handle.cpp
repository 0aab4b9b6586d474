#include "sources/odbc_handle.h"

#include <sql.h>
#include <sqlext.h>
#include <sqlucode.h>

#include <utility>

#include "platform/text_encoding.h"
#include "sources/column_text.h"

namespace qm {

namespace {

constexpr std::size_t kMaxDiagnosticCharacters = 2047;

}  // namespace

OdbcHandle::OdbcHandle(OdbcHandle&& other) noexcept
    : handle_(std::exchange(other.handle_, nullptr)), type_(other.type_) {}

OdbcHandle& OdbcHandle::operator=(OdbcHandle&& other) noexcept {
  if (this != &other) {
    Free();
    handle_ = std::exchange(other.handle_, nullptr);
    type_ = other.type_;
  }
  return *this;
}

bool OdbcHandle::Allocate(int16_t type, const OdbcHandle* parent) {
  Free();
  SQLHANDLE h = SQL_NULL_HANDLE;
  const SQLRETURN rc =
      SQLAllocHandle(type, parent != nullptr ? parent->handle_ : SQL_NULL_HANDLE, &h);
  if (!SQL_SUCCEEDED(rc) || h == SQL_NULL_HANDLE) return false;
  handle_ = h;
  type_ = type;
  return true;
}

bool OdbcHandle::Free() noexcept {
  if (handle_ == nullptr) return true;
  const SQLRETURN rc = SQLFreeHandle(type_, std::exchange(handle_, nullptr));
  return SQL_SUCCEEDED(rc);
}

namespace {

// The message through the wide call: a driver that takes UTF-16 hands it out
// whole, where the driver manager would narrow it one code unit at a time.
OdbcDiagnostic ReadWideDiagnostic(const OdbcHandle& handle) {
  OdbcDiagnostic d;
  SQLWCHAR state[6] = {};
  SQLINTEGER native = 0;
  SQLSMALLINT length = 0;
  std::u16string message(1024, u'\0');
  auto ask = [&] {
    return SQLGetDiagRecW(handle.Type(), handle.Get(), 1, state, &native,
                          reinterpret_cast<SQLWCHAR*>(message.data()),
                          static_cast<SQLSMALLINT>(message.size()), &length);
  };
  if (!SQL_SUCCEEDED(ask())) return d;
  if (length >= static_cast<SQLSMALLINT>(message.size())) {
    message.assign(static_cast<std::size_t>(length) + 1, u'\0');
    if (!SQL_SUCCEEDED(ask())) return d;
  }
  message.resize(std::char_traits<char16_t>::length(message.c_str()));
  for (int i = 0; i < 5; ++i) d.sqlstate += static_cast<char>(state[i] & 0x7F);
  std::u16string cut;
  AssignColumnText(message, kMaxDiagnosticCharacters, cut);
  d.text = Utf16ToUtf8(cut);
  return d;
}

}  // namespace

OdbcDiagnostic ReadDiagnostic(const OdbcHandle& handle, bool wide) {
  OdbcDiagnostic d;
  if (!handle) return d;
  if (wide) return ReadWideDiagnostic(handle);
  SQLCHAR state[6] = {};
  SQLINTEGER native = 0;
  SQLSMALLINT length = 0;
  std::string message(1024, '\0');
  auto ask = [&] {
    return SQLGetDiagRec(handle.Type(), handle.Get(), 1, state, &native,
                         reinterpret_cast<SQLCHAR*>(message.data()),
                         static_cast<SQLSMALLINT>(message.size()), &length);
  };
  if (!SQL_SUCCEEDED(ask())) return d;
  if (length >= static_cast<SQLSMALLINT>(message.size())) {
    // A longer message: ask again with room for all of it.
    message.assign(static_cast<std::size_t>(length) + 1, '\0');
    if (!SQL_SUCCEEDED(ask())) return d;
  }
  message.resize(std::char_traits<char>::length(message.c_str()));
  d.sqlstate.assign(reinterpret_cast<const char*>(state), 5);
  AssignColumnText(message, kMaxDiagnosticCharacters, d.text);
  return d;
}

std::string ReadSqlState(const OdbcHandle& handle) {
  if (!handle) return {};
  SQLCHAR state[6] = {};
  SQLINTEGER native = 0;
  SQLSMALLINT length = 0;
  SQLCHAR message[1];
  const SQLRETURN rc =
      SQLGetDiagRec(handle.Type(), handle.Get(), 1, state, &native, message, 0, &length);
  if (!SQL_SUCCEEDED(rc)) return {};
  return std::string(reinterpret_cast<const char*>(state), 5);
}

}  // namespace qm
