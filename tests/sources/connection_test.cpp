// URL retrieval against a real HTTP server on 127.0.0.1, and document columns
// fetched by address.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <ctime>
#include <filesystem>

#include "base/exception_family.h"
#include "sources/connection.h"
#include "sources/doc_converter.h"
#include "sources/document_text.h"
#include "sources/converter_home.h"

namespace qm {
namespace {

namespace fs = std::filesystem;
using test::FailureText;
using test::ReadFile;

// The test server helper, started once for the whole test program.
class ServerProcess {
 public:
  ServerProcess() {
    int out[2];
    if (pipe(out) != 0) return;
    const std::string path = test::HelperPath("http_test_server");  // no allocation after fork
    pid_ = fork();
    if (pid_ == 0) {
      prctl(PR_SET_PDEATHSIG, SIGKILL);  // never outlives a crashed test
      dup2(out[1], 1);
      close(out[0]);
      close(out[1]);
      execl(path.c_str(), path.c_str(), static_cast<char*>(nullptr));
      _exit(127);
    }
    close(out[1]);
    FILE* in = fdopen(out[0], "r");
    if (in == nullptr || std::fscanf(in, "%d", &port_) != 1) port_ = 0;
    if (in != nullptr) std::fclose(in);
  }
  ~ServerProcess() {
    if (pid_ > 0) {
      kill(pid_, SIGKILL);
      waitpid(pid_, nullptr, 0);
    }
  }
  int Port() const { return port_; }

 private:
  pid_t pid_ = -1;
  int port_ = 0;
};

const ServerProcess& Server() {
  static const ServerProcess server;
  return server;
}

constexpr const char* kTimeoutText = "Connection Timeout (Module:Connection,Method:OpenConnection)\r\n";

class ConnectionTest : public ::testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NE(Server().Port(), 0) << "the test server did not start";
    base_ = "http://127.0.0.1:" + std::to_string(Server().Port());
    // Silent servers must not make these tests slow.
    Connection::SetTransferLimitsForTesting(std::chrono::milliseconds(1500), std::chrono::seconds(1));
  }
  void TearDown() override {
    Connection::SetTransferLimitsForTesting(Connection::kTransferTimeout, Connection::kLowSpeedTime);
  }

  std::string Fetch(Connection& c, const std::string& path) {
    c.OpenConnection(base_ + path);
    const std::string file = dir_.Path() + "download";
    c.DownloadResource(file);
    c.CloseConnection();
    return ReadFile(file);
  }

  int Hits(const std::string& path) {
    Connection c;
    return std::stoi(Fetch(c, "/hits" + path));
  }

  std::string base_;
  test::ScratchDir dir_{"downloads"};
};

TEST_F(ConnectionTest, PagesAndEmptyResourcesWithTheUserAgent) {
  Connection c;
  EXPECT_EQ(Fetch(c, "/page.html"),
            "<html><head><title>River Guide</title></head>"
            "<body><p>Salmon swim upstream.</p></body></html>");
  EXPECT_EQ(c.GetStatusCode(), 200);
  // Tue, 15 Nov 1994 08:12:31 GMT in local time.
  const std::time_t when = 784887151;
  std::tm local{};
  localtime_r(&when, &local);
  const DateTimeValue& m = c.GetLastModified();
  EXPECT_EQ(m.year, local.tm_year + 1900);
  EXPECT_EQ(m.month, local.tm_mon + 1);
  EXPECT_EQ(m.day, local.tm_mday);
  EXPECT_EQ(m.hour, local.tm_hour);
  EXPECT_EQ(m.minute, 12);
  EXPECT_EQ(m.second, 31);

  // The same object serves the next addresses; an empty resource gives an empty file.
  const std::string file = dir_.Path() + "download";
  EXPECT_EQ(Fetch(c, "/empty.txt"), "");
  EXPECT_TRUE(fs::exists(file));

  // A body is downloaded once; a second download does not pass for an empty resource.
  c.OpenConnection(base_ + "/page.html");
  c.DownloadResource(file);
  EXPECT_NE(FailureText([&] { c.DownloadResource(file); }).find("Method:DownloadResource"),
            std::string::npos);

  const std::string head = Fetch(c, "/echo");
  EXPECT_NE(head.find("\r\nUser-Agent: Quillmere Search Search Engine Software ("), std::string::npos)
      << head;
}

TEST_F(ConnectionTest, StatusOutsideSuccessFailsTheOpen) {
  Connection c;
  const int page_hits = Hits("/page.html");
  EXPECT_EQ(FailureText([&] { c.OpenConnection(base_ + "/redirect"); }), kTimeoutText);
  EXPECT_EQ(c.GetStatusCode(), 302);
  EXPECT_EQ(Hits("/page.html"), page_hits) << "the redirection was followed";

  EXPECT_EQ(FailureText([&] { c.OpenConnection(base_ + "/missing"); }), kTimeoutText);
  EXPECT_EQ(c.GetStatusCode(), 404);
  // Nothing of the error page can be downloaded afterwards.
  EXPECT_EQ(FailureText([&] { c.DownloadResource(dir_.Path() + "error-page"); }),
            "Error downloading resource: no address is open "
            "(Module:Connection,Method:DownloadResource)\r\n");
  EXPECT_FALSE(fs::exists(dir_.Path() + "error-page"));

  EXPECT_EQ(Fetch(c, "/page.html").substr(0, 6), "<html>") << "a failed open spoils nothing";
}

TEST_F(ConnectionTest, UnreachableSilentAndForeignAddressesFail) {
  Connection c;
  EXPECT_EQ(FailureText([&] { c.OpenConnection(base_ + "/silent"); }), kTimeoutText);
  EXPECT_EQ(c.GetStatusCode(), 0);

  // Only http and https: never a local file or another protocol.
  const std::string secret = dir_.Path() + "secret.txt";
  test::WriteFile(secret, "private");
  for (const std::string& address :
       {"file://" + secret, "ftp://127.0.0.1:" + std::to_string(Server().Port()) + "/x"}) {
    EXPECT_EQ(FailureText([&] { c.OpenConnection(address); }), kTimeoutText) << address;
  }

  // A port where nobody listens.
  const int port = Server().Port() == 65535 ? 65534 : Server().Port() + 1;
  EXPECT_EQ(FailureText([&] { c.OpenConnection("http://127.0.0.1:" + std::to_string(port) + "/"); }),
            kTimeoutText);
}

TEST_F(ConnectionTest, ATransferThatStopsFailsTheDownload) {
  Connection c;
  c.OpenConnection(base_ + "/stall");
  EXPECT_EQ(c.GetStatusCode(), 200);
  const std::string text = FailureText([&] { c.DownloadResource(dir_.Path() + "partial"); });
  EXPECT_EQ(text.rfind("Error downloading resource: ", 0), 0u) << text;
  EXPECT_NE(text.find("(Module:Connection,Method:DownloadResource)"), std::string::npos) << text;
}

TEST_F(ConnectionTest, UrlColumnsIndexThePageOrNothing) {
  test::ConverterHome home;
  home.WriteConverters(".html=[QUILLMERE_HTML_CONVERTER]\n.txt=[PLAIN_TEXT]\n");
  DocConverter converter(home.Defs());
  Connection c;
  // Base and value are joined as they are.
  EXPECT_EQ(UrlDocumentText(converter, c, home.Defs(), base_ + "/page", ".html"),
            "River Guide Salmon swim upstream.");
  EXPECT_EQ(UrlDocumentText(converter, c, home.Defs(), base_, "/empty.txt"), "");
  // A silent server leaves the value empty, and the next one works.
  EXPECT_EQ(UrlDocumentText(converter, c, home.Defs(), base_, "/silent"), "");
  EXPECT_EQ(UrlDocumentText(converter, c, home.Defs(), base_ + "/", "page.html"),
            "River Guide Salmon swim upstream.");
  EXPECT_EQ(home.WorkFileCount(), 0);
  const std::string trace = home.TraceText();
  EXPECT_NE(trace.find("RepDB.StartCollector - Could not open url " + base_ +
                       "/silent because of the following error: Connection Timeout"),
            std::string::npos)
      << trace;
}

}  // namespace
}  // namespace qm
