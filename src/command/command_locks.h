// The names of the writer locks under which the file-changing commands run:
// a fixed prefix followed directly by the object name. Other processes that
// run commands on the same objects meet these names, so they must not change.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "command/command_type.h"

namespace qm {

inline constexpr std::string_view kSyncCreatePrefix = "MORVIL_SYNCHRONIZE_CREATE";
inline constexpr std::string_view kSyncOrderPrefix = "MORVIL_SYNCHRONIZE_ORDER";
inline constexpr std::string_view kSyncDropFindexPrefix = "MORVIL_SYNCHRONIZE_DROP_FINDEX_";
inline constexpr std::string_view kSyncDropOrderPrefix = "MORVIL_SYNCHRONIZE_DROP_ORDER_";
inline constexpr std::string_view kSyncDeletePrefix = "MORVIL_SYNCHRONIZE_DELETE_";

// The lock prefix of a command type; empty for commands that change no files.
constexpr std::string_view CommandLockPrefix(int32_t cmd_type) {
  switch (cmd_type) {
    case kCmdFindexStored:
    case kCmdFindexDefined:
      return kSyncCreatePrefix;
    case kCmdOrderStored:
    case kCmdOrderDefined:
      return kSyncOrderPrefix;
    case kCmdDropFindex:
      return kSyncDropFindexPrefix;
    case kCmdDropOrder:
      return kSyncDropOrderPrefix;
    case kCmdDeleteKey:
      return kSyncDeletePrefix;
    default:
      return {};
  }
}

// The whole lock name for a command on an object; empty when the command
// takes no lock.
inline std::string CommandLockName(int32_t cmd_type, std::string_view object_name) {
  const std::string_view prefix = CommandLockPrefix(cmd_type);
  if (prefix.empty()) return {};
  std::string name(prefix);
  name += object_name;
  return name;
}

}  // namespace qm
