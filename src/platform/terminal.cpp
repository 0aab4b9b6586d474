#include "platform/terminal.h"

#include <unistd.h>

namespace qm::platform {

bool IsTerminal(std::FILE* stream) {
  const int fd = stream == nullptr ? -1 : fileno(stream);
  return fd >= 0 && isatty(fd) == 1;
}

}  // namespace qm::platform
