// CGlobalDefs: the settings of one API object, shared by the engine parts that
// work for it: data path, group, data-source connection, trace flags; and the
// folder kinds of the home and data trees with their placeholders.
#pragma once

#include <cstdint>
#include <mutex>
#include <string>
#include <string_view>

namespace qm {

enum class FolderKind : int32_t {
  Data = 0,
  Repositories = 1,
  Definitions = 2,
  WorkData = 3,
  Queries = 4,
  Converters = 5,
  DataStore = 6,
  Group = 7,
  Home = 8,
  GroupConfig = 9,
  System = 10,
  Log = 11,
  Indexes = 12,
  Orders = 13,
  HomeConfig = 14,
  Tasks = 15,
  Repositories2 = 16,
  Language = 17,
  Groups = 18,
};

enum class ConnectionMode : int32_t { Dsn = 0, ConnectionString = 1 };

class CGlobalDefs {
 public:
  // Reads the trace levels (home/Log/traceStat.log).
  CGlobalDefs();
  // A copy for a background job: every setting, its own critical sections.
  CGlobalDefs(const CGlobalDefs& other);
  CGlobalDefs& operator=(const CGlobalDefs& other);

  // --- folders (paths end in "/") ---
  // Home part; with placeholder, "[QUILLMERE_HOME]\" instead of the configured home.
  std::string GetHomePath(FolderKind kind, bool placeholder = false) const;
  // Data part; raises STDFUN "Data path is not set" when no root is known.
  std::string GetFullDataPath(FolderKind kind, bool placeholder = false) const;
  // Dispatches by kind.
  std::string GetFolder(FolderKind kind, bool placeholder = false) const;
  // Replaces every placeholder by its folder (HOME, DATA, DATA_GROUP,
  // DATA_CONVERTERS, DATA_STORE, in this order).
  std::string ExpandPlaceholders(std::string_view text) const;
  // Replaces only the home and home-config placeholders.
  std::string ExpandHomePlaceholders(std::string_view text) const;
  // Replaces the data root by "[QUILLMERE_DATA]\", keeping the rest as it is.
  std::string CollapseDataPath(std::string_view text) const;

  // --- data path and group ---
  void SetDataPath(std::string_view path);
  std::string GetDataPath() const;
  void SetGroup(std::string_view group);
  std::string GetGroup() const;

  // --- connection ---
  void SetConnectionDsn(std::string_view dsn, std::string_view user, std::string_view password);
  void SetConnectionString(std::string_view text, std::string_view display_name);
  // "DEFAULT", "SQL_GROUP_DEFAULT", or a connection string as given.
  void SetConnection(std::string_view text, std::string_view display_name);
  std::string GetConnectionString() const;
  std::string GetDisplayName() const;
  // Reads the group's Config/dbc.dat if it exists.
  void LoadGroupConnection();
  ConnectionMode GetConnectionMode() const;
  bool IsConnectionSet() const;
  std::string GetDsn() const;
  std::string GetUserId() const;
  std::string GetPassword() const;

  // --- trace flags read at construction ---
  bool TraceLevel1() const { return trace1_; }
  bool TraceLevel2() const { return trace2_; }
  bool TraceLevel3() const { return trace3_; }

  static constexpr const char* kVersionText = "6.14";
  static constexpr int32_t kVersion = 614;
  static constexpr int32_t kMajorVersion = 6;
  static constexpr int32_t kFileVersion = 601;

 private:
  mutable std::mutex mutex_;  // guards every field below
  std::string data_path_;
  std::string connection_string_;
  std::string display_name_;
  std::string group_ = "PUBLIC";
  std::string dsn_;
  std::string user_id_;
  std::string password_;
  ConnectionMode mode_ = ConnectionMode::Dsn;
  bool connection_set_ = false;
  bool trace1_ = false;
  bool trace2_ = false;
  bool trace3_ = false;
};

// Temporary names: "tmpxxxx_" + caller + "_" + counter, the counter kept in
// generator.dat under the kind 8 writer lock.
std::string SLGetTempFileName(const CGlobalDefs& defs, bool group_scope, int32_t caller);
// A WorkData path that does not exist yet, ending in ".tmp" or in the extension
// of source_name when given (and usable); the file is created exclusively.
std::string SLGetTempWorkFilePath(const CGlobalDefs& defs, int32_t caller,
                                  std::string_view source_name = {});
std::string SLGetTempConfigFilePath(const CGlobalDefs& defs, int32_t caller);

// The keyless byte substitution of connection texts; its own inverse.
void ScrambleConnectionText(std::string& text);

}  // namespace qm
