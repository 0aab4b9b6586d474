// Runs the built quillmere host as a child process on a scratch folder's
// data directory, and makes the SQLite databases the host tests read.
#pragma once

#include <string>
#include <vector>

namespace qm::test {

struct HostResult {
  int status = -1;
  std::string out;
  std::string err;
};

// quillmere --data SCRATCH/data ARGS..., input on its standard input.
// scratch ends in "/"; standard error goes through scratch's stderr.txt.
HostResult RunHost(const std::string& scratch, const std::vector<std::string>& args,
                   const std::string& input = std::string());

// Runs the statements on the SQLite file (created when missing) and returns
// its connection string for the SQLite ODBC driver.
std::string SqliteDatabase(const std::string& file, const std::vector<std::string>& statements);

}  // namespace qm::test
