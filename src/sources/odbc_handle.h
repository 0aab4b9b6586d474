// OdbcHandle: one ODBC handle (environment, connection or statement), freed
// when its owner lets go of it; and the first diagnostic record of a handle.
// The ODBC headers stay out of this header: their typedefs would leak into
// every file that reads data.
#pragma once

#include <cstdint>
#include <string>

namespace qm {

class OdbcHandle {
 public:
  // ODBC handle type codes (SQL_HANDLE_ENV, SQL_HANDLE_DBC, SQL_HANDLE_STMT).
  static constexpr int16_t kEnvironment = 1;
  static constexpr int16_t kConnection = 2;
  static constexpr int16_t kStatement = 3;

  OdbcHandle() = default;
  OdbcHandle(OdbcHandle&& other) noexcept;
  OdbcHandle& operator=(OdbcHandle&& other) noexcept;
  OdbcHandle(const OdbcHandle&) = delete;
  OdbcHandle& operator=(const OdbcHandle&) = delete;
  ~OdbcHandle() { Free(); }

  // Allocates a handle of the given type below parent (null for an
  // environment); returns false when the driver manager refuses.
  bool Allocate(int16_t type, const OdbcHandle* parent);

  // Frees the handle if one is held; false when the driver manager refused
  // (the handle counts as released either way).
  bool Free() noexcept;

  void* Get() const { return handle_; }
  int16_t Type() const { return type_; }
  explicit operator bool() const { return handle_ != nullptr; }

 private:
  void* handle_ = nullptr;
  int16_t type_ = 0;
};

struct OdbcDiagnostic {
  std::string sqlstate;  // five characters, empty when there was no record
  std::string text;      // the driver's message, empty when there was no record
};

// The first diagnostic record of a handle; the message is cut at 2,047
// characters. Without a handle or a record both fields stay empty. wide: ask
// through the wide call (for a connection made through the wide calls).
OdbcDiagnostic ReadDiagnostic(const OdbcHandle& handle, bool wide = false);

// The SQLSTATE of the first diagnostic record only (cheaper: no message).
std::string ReadSqlState(const OdbcHandle& handle);

}  // namespace qm
