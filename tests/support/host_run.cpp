#include "support/host_run.h"

#include "config/global_defs.h"
#include "sources/share_database.h"
#include "support/test_support.h"

namespace qm::test {

HostResult RunHost(const std::string& scratch, const std::vector<std::string>& args,
                   const std::string& input) {
  HostResult r;
  const std::string err_file = scratch + "stderr.txt";
  const std::string in_file = scratch + "stdin.txt";
  WriteFile(in_file, input);
  std::vector<std::string> argv{"/bin/sh", "-c",
                                "e=$1; i=$2; shift 2; exec \"$@\" 2> \"$e\" < \"$i\"", "sh",
                                err_file, in_file, QM_CLI_PATH, "--data", scratch + "data"};
  argv.insert(argv.end(), args.begin(), args.end());
  r.status = RunProgram(argv, &r.out);
  r.err = ReadFile(err_file);
  return r;
}

std::string SqliteDatabase(const std::string& file, const std::vector<std::string>& statements) {
  const std::string connect = "Driver=SQLite3;Database=" + file + ";StepAPI=1;";
  CGlobalDefs defs;
  defs.SetConnectionString(connect, "test");
  CShareDatabase db(defs);
  db.Connect();
  int16_t columns = 0;
  for (const auto& statement : statements) db.ExecuteSql(statement, columns);
  db.Disconnect();
  return connect;
}

}  // namespace qm::test
