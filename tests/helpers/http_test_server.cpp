// A small HTTP/1.1 server on 127.0.0.1 for the URL retrieval tests. Prints its
// port on the first line of standard output, then serves until killed:
//   /page.html   200, an HTML page with a Last-Modified header
//   /empty.txt   200, no body
//   /big.txt     200, 100,000 bytes of a known pattern
//   /echo        200, the request head as the body
//   /redirect    302 to /page.html
//   /missing     404 with an HTML error page
//   /silent      accepts the request and never answers
//   /stall       sends the head and part of the body, then nothing more
//   /hits/PATH   200, how many times PATH was requested
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdio>
#include <map>
#include <mutex>
#include <string>
#include <thread>

namespace {

std::mutex g_mutex;
std::map<std::string, int> g_hits;

void SendAll(int fd, const std::string& data) {
  std::size_t sent = 0;
  while (sent < data.size()) {
    const ssize_t n = send(fd, data.data() + sent, data.size() - sent, MSG_NOSIGNAL);
    if (n <= 0) return;
    sent += static_cast<std::size_t>(n);
  }
}

std::string Response(int status, const std::string& reason, const std::string& extra_headers,
                     const std::string& body) {
  return "HTTP/1.1 " + std::to_string(status) + " " + reason + "\r\n" + extra_headers +
         "Content-Length: " + std::to_string(body.size()) + "\r\nConnection: close\r\n\r\n" + body;
}

std::string BigBody() {
  std::string body;
  for (int i = 0; body.size() < 100000; ++i) body += "line " + std::to_string(i) + "\n";
  body.resize(100000);
  return body;
}

// Blocks until the client goes away.
void WaitForClose(int fd) {
  char buffer[256];
  while (recv(fd, buffer, sizeof buffer, 0) > 0) {
  }
}

void Serve(int fd) {
  std::string head;
  char buffer[4096];
  while (head.find("\r\n\r\n") == std::string::npos && head.size() < 65536) {
    const ssize_t n = recv(fd, buffer, sizeof buffer, 0);
    if (n <= 0) {
      close(fd);
      return;
    }
    head.append(buffer, static_cast<std::size_t>(n));
  }
  const auto first_blank = head.find(' ');
  const auto second_blank = head.find(' ', first_blank + 1);
  const std::string path = head.substr(first_blank + 1, second_blank - first_blank - 1);
  const bool hits_query = path.substr(0, 6) == "/hits/";
  int hits_so_far = 0;
  {
    std::lock_guard lock(g_mutex);
    if (hits_query) {
      hits_so_far = g_hits[path.substr(5)];
    } else {
      ++g_hits[path];
    }
  }

  if (path == "/page.html") {
    SendAll(fd, Response(200, "OK",
                         "Content-Type: text/html\r\nLast-Modified: Tue, 15 Nov 1994 08:12:31 GMT\r\n",
                         "<html><head><title>River Guide</title></head>"
                         "<body><p>Salmon swim upstream.</p></body></html>"));
  } else if (path == "/empty.txt") {
    SendAll(fd, Response(200, "OK", "Content-Type: text/plain\r\n", ""));
  } else if (path == "/big.txt") {
    SendAll(fd, Response(200, "OK", "Content-Type: text/plain\r\n", BigBody()));
  } else if (path == "/echo") {
    SendAll(fd, Response(200, "OK", "Content-Type: text/plain\r\n", head));
  } else if (path == "/redirect") {
    SendAll(fd, Response(302, "Found", "Location: /page.html\r\n", "moved"));
  } else if (path == "/missing") {
    SendAll(fd, Response(404, "Not Found", "Content-Type: text/html\r\n",
                         "<html><body>Nothing here</body></html>"));
  } else if (path == "/silent") {
    WaitForClose(fd);
  } else if (path == "/stall") {
    SendAll(fd, "HTTP/1.1 200 OK\r\nContent-Length: 5000\r\nConnection: close\r\n\r\nbegin");
    WaitForClose(fd);
  } else if (hits_query) {
    SendAll(fd, Response(200, "OK", "", std::to_string(hits_so_far)));
  } else {
    SendAll(fd, Response(404, "Not Found", "", ""));
  }
  close(fd);
}

}  // namespace

int main() {
  const int listener = socket(AF_INET, SOCK_STREAM, 0);
  if (listener < 0) return 1;
  const int on = 1;
  setsockopt(listener, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
  sockaddr_in address{};
  address.sin_family = AF_INET;
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  address.sin_port = 0;
  if (bind(listener, reinterpret_cast<sockaddr*>(&address), sizeof address) != 0) return 1;
  if (listen(listener, 64) != 0) return 1;
  socklen_t length = sizeof address;
  getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length);
  std::printf("%d\n", ntohs(address.sin_port));
  std::fflush(stdout);
  for (;;) {
    const int fd = accept(listener, nullptr, nullptr);
    if (fd < 0) continue;
    std::thread(Serve, fd).detach();
  }
}
