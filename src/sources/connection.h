// Connection: fetches web resources for document columns. One object serves a
// whole findex build and keeps its connections alive between addresses.
//
// Only http and https are fetched; redirections are not followed; nothing is
// cached. A connect time-out, a transfer time-out and a low-speed abort keep a
// silent server from holding up a build.
#pragma once

#include <chrono>
#include <memory>
#include <string>

#include "base/value.h"

namespace qm {

class Connection {
 public:
  static constexpr std::chrono::milliseconds kBuildConnectTimeout{2000};
  static constexpr std::chrono::milliseconds kTransferTimeout{50000};
  static constexpr std::chrono::seconds kLowSpeedTime{30};  // below 1 byte/s this long
  static constexpr std::size_t kDownloadPiece = 1990;

  // A connect_timeout of 0 keeps the library's own connect time-out.
  explicit Connection(std::chrono::milliseconds connect_timeout = kBuildConnectTimeout);
  ~Connection();
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;

  // Requests the address and reads the response head. Any failure, including
  // a status outside 200-299, raises "Connection Timeout" (method
  // "OpenConnection"); the reason goes to the trace.
  void OpenConnection(const std::string& address);
  // Writes the opened resource's body into the file (created or truncated),
  // in pieces of at most kDownloadPiece bytes. REQUIRES: a successful open.
  // Failures raise "Error downloading resource: %S" (method "DownloadResource").
  void DownloadResource(const std::string& file_path);
  // Ends the current address (a transfer still running is dropped).
  void CloseConnection();

  // HTTP status of the last opened address (0 when none answered).
  long GetStatusCode() const { return status_code_; }
  // Its Last-Modified time as local time, or the local time of the open.
  const DateTimeValue& GetLastModified() const { return last_modified_; }

  // The user-agent text sent with every request.
  static std::string UserAgent();

  // Shortens the transfer time-out and the low-speed window of connections
  // made afterwards, so tests of silent servers end quickly.
  static void SetTransferLimitsForTesting(std::chrono::milliseconds transfer,
                                          std::chrono::seconds low_speed_time);

 private:
  struct Transfer;

  std::unique_ptr<Transfer> transfer_;
  long status_code_ = 0;
  DateTimeValue last_modified_;
};

}  // namespace qm
