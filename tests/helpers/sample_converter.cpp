// An external converter program for the tests, started by the engine.
//   sample_converter copy IN OUT    writes "converted: " + IN's bytes to OUT
//   sample_converter args OUT A...  writes the count of A... and each A on its own line
//   sample_converter hang PIDFILE   writes its process id to PIDFILE, then never ends
//   sample_converter fail           ends with status 3 without writing
#include <unistd.h>

#include <fstream>
#include <sstream>
#include <string>

int main(int argc, char** argv) {
  if (argc < 2) return 2;
  const std::string mode = argv[1];
  if (mode == "copy" && argc == 4) {
    std::ifstream in(argv[2], std::ios::binary);
    if (!in) return 4;
    std::ostringstream content;
    content << in.rdbuf();
    std::ofstream out(argv[3], std::ios::binary | std::ios::trunc);
    out << "converted: " << content.str();
    return out ? 0 : 5;
  }
  if (mode == "args" && argc >= 3) {
    std::ofstream out(argv[2], std::ios::binary | std::ios::trunc);
    out << (argc - 3) << '\n';
    for (int i = 3; i < argc; ++i) out << argv[i] << '\n';
    return out ? 0 : 5;
  }
  if (mode == "hang" && argc == 3) {
    {
      std::ofstream pid(argv[2], std::ios::trunc);
      pid << getpid() << '\n';
    }
    for (;;) pause();
  }
  if (mode == "fail") return 3;
  return 2;
}
