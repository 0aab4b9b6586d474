#include "sources/connection.h"

#include <curl/curl.h>
#include <fcntl.h>

#include <algorithm>
#include <atomic>
#include <ctime>
#include <mutex>
#include <string_view>

#include "platform/config_store.h"
#include "platform/file_io.h"
#include "base/exception_family.h"
#include "base/trace.h"

namespace qm {

namespace {

constexpr std::string_view kAgentPrefix = "Quillmere Search Search Engine Software";
constexpr std::string_view kDefaultWebAddress = "https://quillmere.example/";
constexpr const char* kTraceTag = "REPLIB.Connection.OpenConnection";

std::atomic<long long> g_transfer_ms{Connection::kTransferTimeout.count()};
std::atomic<long long> g_low_speed_s{Connection::kLowSpeedTime.count()};

void GlobalInit() {
  static std::once_flag once;
  // Never cleaned up: other threads may still use the library at exit.
  std::call_once(once, [] { curl_global_init(CURL_GLOBAL_DEFAULT); });
}

DateTimeValue LocalDateTime(std::time_t when) {
  std::tm tm{};
  localtime_r(&when, &tm);
  DateTimeValue value;
  value.year = static_cast<int16_t>(tm.tm_year + 1900);
  value.month = static_cast<uint16_t>(tm.tm_mon + 1);
  value.day = static_cast<uint16_t>(tm.tm_mday);
  value.hour = static_cast<uint16_t>(tm.tm_hour);
  value.minute = static_cast<uint16_t>(tm.tm_min);
  value.second = static_cast<uint16_t>(tm.tm_sec);
  return value;
}

// Blanks, controls and non-ASCII bytes percent-encoded; everything else,
// including existing escapes, left as the caller wrote it.
std::string EncodeAddress(std::string_view address) {
  static constexpr char kHex[] = "0123456789ABCDEF";
  std::string out;
  out.reserve(address.size());
  for (char ch : address) {
    const auto c = static_cast<unsigned char>(ch);
    if (c <= 0x20 || c >= 0x7F) {
      out.push_back('%');
      out.push_back(kHex[c >> 4]);
      out.push_back(kHex[c & 0xF]);
    } else {
      out.push_back(ch);
    }
  }
  return out;
}

}  // namespace

// One easy handle (the address) inside its own multi handle (the connection
// cache), driven step by step so that the head and the body can be read by
// separate calls.
struct Connection::Transfer {
  CURLM* multi = nullptr;
  CURL* easy = nullptr;
  bool attached = false;      // the easy handle is in the multi handle
  bool head_complete = false; // the final response head has arrived
  bool finished = false;
  CURLcode result = CURLE_OK;
  std::string pending;        // body bytes that arrived before DownloadResource
  int file = -1;              // where body bytes go during DownloadResource
  bool write_failed = false;
  char error[CURL_ERROR_SIZE] = {};

  ~Transfer() {
    if (attached) curl_multi_remove_handle(multi, easy);
    if (easy != nullptr) curl_easy_cleanup(easy);
    if (multi != nullptr) curl_multi_cleanup(multi);
  }

  bool WriteToFile(const char* data, std::size_t size) {
    while (size > 0) {
      const std::size_t piece = std::min(size, kDownloadPiece);
      if (!platform::WriteAll(file, data, piece)) return false;
      data += piece;
      size -= piece;
    }
    return true;
  }

  static size_t OnBody(char* data, size_t, size_t size, void* self) {
    auto* t = static_cast<Transfer*>(self);
    if (t->file < 0) {
      t->pending.append(data, size);
      return size;
    }
    if (!t->WriteToFile(data, size)) {
      t->write_failed = true;
      return 0;  // aborts the transfer
    }
    return size;
  }

  static size_t OnHeader(char* data, size_t, size_t size, void* self) {
    auto* t = static_cast<Transfer*>(self);
    const std::string_view line(data, size);
    if (line == "\r\n" || line == "\n") {
      long status = 0;
      curl_easy_getinfo(t->easy, CURLINFO_RESPONSE_CODE, &status);
      // An interim 1xx head is followed by the real one.
      if (status >= 200) t->head_complete = true;
    }
    return size;
  }

  // Drives the transfer until done() holds or it ends.
  template <class Done>
  void Pump(Done done) {
    while (!finished && !done()) {
      int running = 0;
      if (curl_multi_perform(multi, &running) != CURLM_OK) {
        finished = true;
        result = CURLE_FAILED_INIT;
        break;
      }
      int left = 0;
      while (CURLMsg* message = curl_multi_info_read(multi, &left)) {
        if (message->msg == CURLMSG_DONE) {
          finished = true;
          result = message->data.result;
        }
      }
      if (finished || done()) break;
      curl_multi_poll(multi, nullptr, 0, 100, nullptr);
    }
  }

  void Detach() {
    if (attached) curl_multi_remove_handle(multi, easy);
    attached = false;
    head_complete = false;
    finished = false;
    result = CURLE_OK;
    pending.clear();
    file = -1;
    write_failed = false;
    error[0] = '\0';
  }

  std::string Reason() const {
    if (error[0] != '\0') return error;
    return curl_easy_strerror(result);
  }
};

std::string Connection::UserAgent() {
  std::string address;
  if (platform::ReadConfigValue("web_address", address) != platform::ConfigStatus::Ok ||
      address.empty()) {
    address = kDefaultWebAddress;
  }
  return std::string(kAgentPrefix) + " (" + address + ")";
}

void Connection::SetTransferLimitsForTesting(std::chrono::milliseconds transfer,
                                             std::chrono::seconds low_speed_time) {
  g_transfer_ms = transfer.count();
  g_low_speed_s = low_speed_time.count();
}

Connection::Connection(std::chrono::milliseconds connect_timeout)
    : transfer_(std::make_unique<Transfer>()) {
  GlobalInit();
  Transfer& t = *transfer_;
  t.multi = curl_multi_init();
  t.easy = curl_easy_init();
  if (t.multi == nullptr || t.easy == nullptr) {
    throw CConnectionException::Text("Error initialising the internet library", "Connection",
                                     nullptr);
  }
  CURL* e = t.easy;
  const std::string agent = UserAgent();
  curl_easy_setopt(e, CURLOPT_USERAGENT, agent.c_str());  // copied by the library
  if (connect_timeout.count() != 0) {
    curl_easy_setopt(e, CURLOPT_CONNECTTIMEOUT_MS, static_cast<long>(connect_timeout.count()));
  }
  curl_easy_setopt(e, CURLOPT_TIMEOUT_MS, static_cast<long>(g_transfer_ms.load()));
  curl_easy_setopt(e, CURLOPT_LOW_SPEED_LIMIT, 1L);
  curl_easy_setopt(e, CURLOPT_LOW_SPEED_TIME, static_cast<long>(g_low_speed_s.load()));
  curl_easy_setopt(e, CURLOPT_FOLLOWLOCATION, 0L);
  // A column value must never make the engine read local files or talk
  // another protocol.
  curl_easy_setopt(e, CURLOPT_PROTOCOLS_STR, "http,https");
  curl_easy_setopt(e, CURLOPT_REDIR_PROTOCOLS_STR, "http,https");
  curl_easy_setopt(e, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(e, CURLOPT_FILETIME, 1L);
  curl_easy_setopt(e, CURLOPT_BUFFERSIZE, static_cast<long>(kDownloadPiece));
  curl_easy_setopt(e, CURLOPT_ERRORBUFFER, t.error);
  curl_easy_setopt(e, CURLOPT_WRITEFUNCTION, &Transfer::OnBody);
  curl_easy_setopt(e, CURLOPT_WRITEDATA, &t);
  curl_easy_setopt(e, CURLOPT_HEADERFUNCTION, &Transfer::OnHeader);
  curl_easy_setopt(e, CURLOPT_HEADERDATA, &t);
}

Connection::~Connection() = default;

void Connection::OpenConnection(const std::string& address) {
  Guard<CConnectionException, CConnectionUnknownException>("OpenConnection", [&] {
    Transfer& t = *transfer_;
    t.Detach();
    status_code_ = 0;
    last_modified_ = LocalDateTime(std::time(nullptr));

    std::string reason;
    const std::string encoded = EncodeAddress(address);
    if (curl_easy_setopt(t.easy, CURLOPT_URL, encoded.c_str()) != CURLE_OK ||
        curl_multi_add_handle(t.multi, t.easy) != CURLM_OK) {
      reason = "the address was refused";
    } else {
      t.attached = true;
      t.Pump([&t] { return t.head_complete; });
      curl_easy_getinfo(t.easy, CURLINFO_RESPONSE_CODE, &status_code_);
      if (t.finished && t.result != CURLE_OK) {
        reason = t.Reason();
      } else if (status_code_ < 200 || status_code_ > 299) {
        reason = "HTTP status " + std::to_string(status_code_);
      }
    }
    if (!reason.empty()) {
      Trace(TraceLevel1, kTraceTag, "Could not open %s: %s", address, reason);
      t.Detach();
      throw CConnectionException::Text("Connection Timeout", "OpenConnection", nullptr);
    }
    curl_off_t modified = -1;
    if (curl_easy_getinfo(t.easy, CURLINFO_FILETIME_T, &modified) == CURLE_OK && modified >= 0) {
      last_modified_ = LocalDateTime(static_cast<std::time_t>(modified));
    }
  });
}

void Connection::DownloadResource(const std::string& file_path) {
  Guard<CConnectionException, CConnectionUnknownException>("DownloadResource", [&] {
    Transfer& t = *transfer_;
    const auto fail = [&](const std::string& why) {
      t.file = -1;
      t.Detach();
      return CConnectionException::Text("Error downloading resource: %S", "DownloadResource",
                                        nullptr, why);
    };
    if (!t.attached) throw fail("no address is open");
    platform::FileHandle file = platform::OpenFile(file_path, O_WRONLY | O_CREAT | O_TRUNC);
    if (!file.IsOpen()) throw fail("cannot create " + file_path);
    t.file = file.Get();
    if (!t.WriteToFile(t.pending.data(), t.pending.size())) throw fail("cannot write " + file_path);
    t.pending.clear();
    t.Pump([] { return false; });
    if (t.write_failed) throw fail("cannot write " + file_path);
    if (t.result != CURLE_OK) throw fail(t.Reason());
    t.file = -1;
    if (file.Close() != 0) throw fail("cannot write " + file_path);
    // The body is consumed: a second download must not pass for an empty resource.
    t.Detach();
  });
}

void Connection::CloseConnection() { transfer_->Detach(); }

}  // namespace qm
