// The command types a translated statement yields (the translator's CMD_TYPE).
#pragma once

#include <cstdint>

namespace qm {

enum CommandType : int32_t {
  kCmdNotRecognised = 0,         // nothing recognised; refused when executed
  kCmdPassThroughSql = 6,        // CREATE INDEX / UPDATE INDEX: SQL for the data source
  kCmdDropFindex = 8,            // DROP FINDEX name
  kCmdConnect = 16,              // CONNECT dsn [user [password]]
  kCmdSetGroup = 17,             // SET GROUP name
  kCmdFindexStored = 23,         // CREATE/UPDATE FINDEX name [REBUILD]
  kCmdFindexDefined = 24,        // CREATE/UPDATE FINDEX name ON TABLE ... KEY k [REBUILD]
  kCmdDeleteKey = 25,            // DELETE FROM FINDEX name key
  kCmdOrderStored = 26,          // CREATE/UPDATE ORDER name [REBUILD]
  kCmdOrderDefined = 27,         // CREATE/UPDATE ORDER name ON TABLE ... KEY k [REBUILD]
  kCmdDropOrder = 28,            // DROP ORDER name
  kCmdSetConnectionString = 29,  // SET CONNECTIONSTRING string
};

}  // namespace qm
