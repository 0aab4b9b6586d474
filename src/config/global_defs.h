// CGlobalDefs: the settings of one API object, shared by the engine parts that
// work for it: data path, group, data-source connection, trace flags; and the
// folder kinds of the home and data trees with their placeholders.
#pragma once

#include <array>
#include <cstdint>
#include <mutex>
#include <string>
#include <string_view>

#include "base/trace.h"
#include "base/connection_scramble.h"

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

// The kinds below the data root, for whoever lays out a data directory.
inline constexpr std::array<FolderKind, 14> kDataFolderKinds = {
    FolderKind::Data,        FolderKind::Language,    FolderKind::Converters,
    FolderKind::Groups,      FolderKind::Group,       FolderKind::Indexes,
    FolderKind::Orders,      FolderKind::GroupConfig, FolderKind::Repositories,
    FolderKind::Repositories2, FolderKind::Definitions, FolderKind::Queries,
    FolderKind::WorkData,    FolderKind::DataStore,
};

// Placeholders as stored, each with its backslash.
inline constexpr std::string_view kPlaceholderHome = "[QUILLMERE_HOME]\\";
inline constexpr std::string_view kPlaceholderConfig = "[QUILLMERE_CONFIG]\\";
inline constexpr std::string_view kPlaceholderData = "[QUILLMERE_DATA]\\";
inline constexpr std::string_view kPlaceholderDataGroup = "[QUILLMERE_DATA_GROUP]\\";
inline constexpr std::string_view kPlaceholderDataConverters = "[QUILLMERE_DATA_CONVERTERS]\\";
inline constexpr std::string_view kPlaceholderDataStore = "[QUILLMERE_DATA_STORE]\\";

enum class ConnectionMode : int32_t { Dsn = 0, ConnectionString = 1 };

class CGlobalDefs {
 public:
  // Reads the trace levels (home/Log/traceStat.log).
  CGlobalDefs();
  // A copy for a background job: every setting, its own critical sections.
  CGlobalDefs(const CGlobalDefs& other);
  CGlobalDefs& operator=(const CGlobalDefs& other);

  // --- folders (paths end in "/"; the configured values are read on every call) ---
  // Home kinds (8, 10, 11, 14, 15). With placeholder, "[QUILLMERE_HOME]\"
  // stands for the home; with no home configured the result is empty.
  std::string GetHomePath(FolderKind kind, bool placeholder = false) const;
  // As GetHomePath, but raises STDFUN "Home path is not set" (naming method)
  // when no home is configured: for operations that would otherwise write
  // relative to the working folder.
  std::string GetHomePathRequired(FolderKind kind, const char* method) const;
  // Data kinds. The root is the caller's data path, else (with placeholder)
  // "[QUILLMERE_HOME]\Data/", else the configured "path"; raises STDFUN
  // "Data path is not set" when there is none. Group folder names are
  // upper-cased.
  std::string GetFullDataPath(FolderKind kind, bool placeholder = false) const;
  // Dispatches by kind; an unknown kind raises.
  std::string GetFolder(FolderKind kind, bool placeholder = false) const;
  // Replaces every placeholder by its folder (HOME, CONFIG, DATA, DATA_GROUP,
  // DATA_CONVERTERS, DATA_STORE, in this order); a folder is resolved only
  // when its placeholder occurs.
  std::string ExpandPlaceholders(std::string_view text) const;
  // Replaces only the home and home-config placeholders.
  std::string ExpandHomePlaceholders(std::string_view text) const;
  // Replaces each occurrence of the data root (spelled exactly) by
  // "[QUILLMERE_DATA]\", keeping the rest of the text as it is.
  std::string CollapseDataPath(std::string_view text) const;

  // --- data path and group ---
  void SetDataPath(std::string_view path);
  std::string GetDataPath() const;
  // The scope of the named locks on this data directory's files: its root
  // folder, or empty (the lock folder's root) when no data path is set.
  std::string GetLockScope() const;
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

  // The display name rule of a connection string: the value of "DSN=", else of
  // "DB=", upper-cased; "No Display Name" when neither occurs.
  static std::string DisplayNameOf(std::string_view connection_string);

  // --- trace flags: the process-wide ones (base/trace.h), the one source of
  // truth, as the last settings object constructed read them ---
  bool TraceLevel1() const { return qm::TraceLevel1.load(std::memory_order_relaxed); }
  bool TraceLevel2() const { return qm::TraceLevel2.load(std::memory_order_relaxed); }
  bool TraceLevel3() const { return qm::TraceLevel3.load(std::memory_order_relaxed); }

  static constexpr const char* kVersionText = "6.14";
  static constexpr int32_t kVersion = 614;
  static constexpr int32_t kMajorVersion = 6;
  static constexpr int32_t kFileVersion = 601;

  // --- progress of the job these settings belong to ---
  // A job's progress never goes backwards: SetProgress keeps the highest value
  // reached since the last ResetProgress.
  void ResetProgress();
  void SetProgress(int32_t percent);
  int32_t GetProgress() const;

 private:
  mutable std::mutex progress_mutex_;  // guards the progress only
  int32_t progress_ = 0;
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
};

}  // namespace qm

#include "config/temp_names.h"
