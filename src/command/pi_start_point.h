// CPiStartPoint: the command engine, the local side of the command object. It
// keeps the engine settings (data path, group, connection, current object
// name, current options, progress and last background error), runs command
// statements blocking or as background jobs, and answers the information,
// existence, drop and option calls.
//
// Every public operation raises only the PiStartPoint family: other failures
// of the exception family are chained below a PiStartPoint error naming the
// operation, anything else becomes its unknown exception.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "command/findex_information.h"
#include "format/index_options.h"
#include "config/global_defs.h"

namespace qm {

class CommandExecution;

class CPiStartPoint {
 public:
  // Opens a trace session with its banner.
  CPiStartPoint();
  // Waits for every background job, then closes the trace session.
  ~CPiStartPoint();
  CPiStartPoint(const CPiStartPoint&) = delete;
  CPiStartPoint& operator=(const CPiStartPoint&) = delete;

  // --- statements ---
  // Blocking: translates and carries out the statement now. Otherwise starts
  // a background job on a private copy of the settings and returns once the
  // job is visible to GetProgress (at 0) with the error state cleared.
  void ExecuteW(std::u16string_view statement, bool blocking);
  // Waits, without time limit, for every background job started so far.
  void WaitForExecute();
  // The running background job's percentage; 100 when none runs. A job
  // reads at most 99 until it has ended and its error state is final.
  int32_t GetProgress() const;
  // The error flag (0 or 1) and message of the last background job to end.
  int32_t GetErrorNumber() const;
  std::u16string GetErrorMsg() const;
  // Returns the error message and clears it.
  std::u16string TakeErrorMsg();

  // --- connection, group, data path, object name ---
  // Stores the DSN triple, then tests it; a failure is error 31.
  void ConnectToDatabase(std::string_view dsn, std::string_view user, std::string_view password);
  void SetDBConnectionString(std::string_view connection_string, std::string_view display_name);
  // 0 when a connection could be opened, 1 when not.
  int32_t TestDBConnection();
  void SetGroup(std::string_view group);
  // The folder must exist: "Data path does not exist: %S".
  void SetDataPath(std::string_view path);
  void SetCurrentObjectName(std::string_view name);

  // --- builds and drops through the API ---
  // A findex (order) from an SQL select used as the table, built as CREATE
  // does. The arguments are checked before anything runs, also for a
  // background build.
  void CreateFindex(std::string_view name, std::string_view sql_select, std::string_view columns,
                    std::string_view key_column, bool blocking,
                    std::string_view date_time_update_key = {});
  void CreateOrder(std::string_view name, std::string_view sql_select, std::string_view columns,
                   std::string_view key_column, bool blocking,
                   std::string_view date_time_update_key = {});
  // DROP FINDEX / DROP ORDER of exactly this name, blocking.
  void DropFindexW(std::u16string_view name);
  void DropOrderW(std::u16string_view name);

  // --- information ---
  // Sets the group, then tells whether the findex opens in it.
  bool FindexExist(std::string_view name, std::string_view group);
  // One information value of the findex (order) named by the current object
  // name in the current group; "" for a value that is not answered.
  std::string GetFindexInfo(int32_t info);
  std::string GetOrderInfo(int32_t info);

  // --- options ---
  void SetIndexLanguageOptions(int32_t language, bool use_stemming, bool use_phonetics,
                               bool use_stop_words, bool strip_accents,
                               bool use_character_translation);
  // Absent separators stay as they are.
  void SetIndexGeneralOptions(bool support_score, bool support_phrases, bool remove_html,
                              const std::optional<std::u16string>& separators,
                              bool add_default_separators, bool save_database_connection,
                              int32_t index_max_size = 0, int32_t index_start_value = 0);
  void SetIndexUpdateOptions(int32_t update_support, bool use_date_time_key,
                             bool use_date_time_fraction);
  // Absent ignore characters stay as they are.
  void SetOrderGeneralOptions(bool save_database_connection, bool ignore_case,
                              const std::optional<std::u16string>& ignore_characters);
  void SetOrderUpdateOptions(int32_t update_support, bool use_date_time_key,
                             bool use_date_time_fraction);
  // With get_default_value the current option, otherwise the one stored with
  // the findex (order) named by the current object name.
  std::string GetIndexLanguageOption(int32_t option, bool get_default_value);
  std::string GetIndexGeneralOption(int32_t option, bool get_default_value);
  std::string GetIndexUpdateOption(int32_t option, bool get_default_value);
  std::string GetOrderGeneralOption(int32_t option, bool get_default_value);
  std::string GetOrderUpdateOption(int32_t option, bool get_default_value);
  // The documented defaults, then the group's option files.
  void LoadDefaultIndexOptions();
  void SaveDefaultIndexOptions();
  void LoadDefaultOrderOptions();
  void SaveDefaultOrderOptions();

  // --- for the API object and tests ---
  IndexOptions CurrentIndexOptions() const;
  OrderOptions CurrentOrderOptions() const;
  std::string GetGroup() const { return defs_.GetGroup(); }
  bool DataPathValid() const { return data_path_valid_; }

 private:
  struct Job;
  struct JobThread {
    std::thread thread;
    std::shared_ptr<Job> job;
  };
  // What a command runs with.
  struct Snapshot {
    IndexOptions index_options;
    OrderOptions order_options;
  };

  Snapshot TakeSnapshot() const;
  std::string CurrentObjectName(const char* method) const;
  // Runs work now on the engine's own settings, or as a background job on a
  // copy of them.
  template <class Work>
  void Run(bool blocking, const char16_t* unknown_text, Work&& work);
  void StartJob(std::shared_ptr<Job> job);
  void RunJob(const std::shared_ptr<Job>& job) noexcept;
  void SetError(int32_t flag, std::u16string message);
  void ClearErrorFlag();
  void JoinFinishedJobs();
  template <class Options>
  std::string OptionText(const char* method, std::string (*render)(const Options&, int32_t),
                         int32_t option, bool get_default_value);
  IndexOptions StoredIndexOptions(const char* method);
  OrderOptions StoredOrderOptions(const char* method);

  CGlobalDefs defs_;
  std::atomic<bool> data_path_valid_{true};

  mutable std::mutex settings_mutex_;  // object name and options
  std::string object_name_;
  IndexOptions index_options_;
  OrderOptions order_options_;

  mutable std::mutex error_mutex_;  // error flag and message
  int32_t error_flag_ = 0;
  std::u16string error_message_;

  mutable std::mutex progress_mutex_;  // the running-job pointer
  std::shared_ptr<Job> running_job_;

  std::mutex handoff_mutex_;  // orders background submissions
  std::mutex wait_mutex_;     // one WaitForExecute at a time
  std::mutex threads_mutex_;  // the list of job threads
  std::vector<JobThread> threads_;
};

}  // namespace qm
