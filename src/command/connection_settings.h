// The connection and group a command statement names (CONNECT, SET GROUP,
// SET CONNECTIONSTRING). The command engine applies them to its CGlobalDefs.
#pragma once

#include <string>

#include "config/global_defs.h"

namespace qm {

struct ConnectionSettings {
  std::string Dsn;
  std::string UserId;
  std::string Password;
  std::string ConnectionString;
  std::string DisplayName;
  std::string Group;
  ConnectionMode Mode = ConnectionMode::Dsn;  // which of the two forms is in force
  bool IsSet = false;                         // a connection has been given
};

}  // namespace qm
