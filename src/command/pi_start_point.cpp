#include "command/pi_start_point.h"

#include <algorithm>
#include <functional>
#include <type_traits>
#include <utility>

#include "base/error_numbers.h"
#include "command/command_execution.h"
#include "command/command_translator.h"
#include "command/findex_column_parser.h"
#include "index/findex_files.h"
#include "format/option_files.h"
#include "command/option_text.h"
#include "command/order_column_parser.h"
#include "index/order_file_set.h"
#include "command/statement_mask.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "sources/share_database.h"

namespace qm {

namespace {

constexpr std::string_view kBannerTag = "PILIB.PiStartPoint.PiStartPoint";
constexpr std::string_view kExecuteTag = "PILIB.CPiStartPoint.ExecuteW";
constexpr std::string_view kJobTag = "PILIB.CPiStartPoint.ThreadFunc";
constexpr std::string_view kBannerFrame = "************************************";


constexpr const char16_t* kUnknownInThreadFunc = u"Unknown Exception in ThreadFunc";
// Background CreateFindex and CreateOrder jobs report with one text.
constexpr const char16_t* kUnknownInCreateThread = u"Unknown Exception in CreateOrderThread";

template <class Body>
decltype(auto) Public(const char* method, Body&& body) {
  return Guard<CPiStartPointException, CPiStartPointUnknownException>(method,
                                                                      std::forward<Body>(body));
}

void TraceBanner(bool flag, std::string_view middle) {
  Trace(flag, kBannerTag, "");
  Trace(flag, kBannerTag, kBannerFrame);
  Trace(flag, kBannerTag, middle);
  Trace(flag, kBannerTag, kBannerFrame);
}

int32_t Bit(bool on, int32_t bit) { return on ? bit : 0; }

}  // namespace

// A background job: a private copy of the settings and what to run on it.
struct CPiStartPoint::Job {
  CGlobalDefs defs;
  std::atomic<bool> data_path_valid;
  IndexOptions index_options;
  OrderOptions order_options;
  std::function<void(CommandExecution&)> work;
  const char16_t* unknown_text = kUnknownInThreadFunc;
  std::atomic<bool> finished{false};

  Job(const CGlobalDefs& engine_defs, bool valid) : defs(engine_defs), data_path_valid(valid) {}
};

CPiStartPoint::CPiStartPoint() {
  TraceBanner(defs_.TraceLevel1(), "**Starting New PILIB Trace Session**");
}

CPiStartPoint::~CPiStartPoint() {
  try {
    WaitForExecute();
  } catch (...) {
    // Joining cannot fail for threads this engine started; nothing may leave
    // a destructor.
  }
  TraceBanner(defs_.TraceLevel1(), "**Ending PILIB Trace Session********");
}

CPiStartPoint::Snapshot CPiStartPoint::TakeSnapshot() const {
  std::lock_guard lock(settings_mutex_);
  return {index_options_, order_options_};
}

IndexOptions CPiStartPoint::CurrentIndexOptions() const { return TakeSnapshot().index_options; }
OrderOptions CPiStartPoint::CurrentOrderOptions() const { return TakeSnapshot().order_options; }

std::string CPiStartPoint::CurrentObjectName(const char* method) const {
  std::string name;
  {
    std::lock_guard lock(settings_mutex_);
    name = object_name_;
  }
  RequirePlainName<CPiStartPointException>("object", name, method);
  return name;
}

// --- statements and jobs ---

template <class Work>
void CPiStartPoint::Run(bool blocking, const char16_t* unknown_text, Work&& work) {
  const Snapshot snapshot = TakeSnapshot();
  if (blocking) {
    CommandExecution execution(defs_, data_path_valid_, snapshot.index_options,
                               snapshot.order_options);
    work(execution);
    return;
  }
  auto job = std::make_shared<Job>(defs_, data_path_valid_.load());
  job->index_options = snapshot.index_options;
  job->order_options = snapshot.order_options;
  job->work = std::forward<Work>(work);
  job->unknown_text = unknown_text;
  StartJob(std::move(job));
}

void CPiStartPoint::StartJob(std::shared_ptr<Job> job) {
  // Submissions are published in the order they arrive: the latest job to
  // start is the one GetProgress reports.
  std::lock_guard handoff(handoff_mutex_);
  job->defs.ResetProgress();
  SetError(0, {});
  {
    std::lock_guard lock(progress_mutex_);
    running_job_ = job;
  }
  try {
    std::lock_guard lock(threads_mutex_);
    JoinFinishedJobs();
    // Room first: once the thread runs, keeping its handle must not fail.
    threads_.reserve(threads_.size() + 1);
    std::thread thread([this, job] { RunJob(job); });
    threads_.push_back({std::move(thread), job});
  } catch (...) {
    std::lock_guard lock(progress_mutex_);
    if (running_job_ == job) running_job_.reset();
    throw;
  }
}

void CPiStartPoint::RunJob(const std::shared_ptr<Job>& job) noexcept {
  try {
    try {
      CommandExecution execution(job->defs, job->data_path_valid, job->index_options,
                                 job->order_options);
      job->work(execution);
      ClearErrorFlag();
    } catch (const CExceptionBase& e) {
      const std::u16string& text = e.GetFullText(100);
      Trace(defs_.TraceLevel1(), kJobTag, "Background job failed: %S", text);
      SetError(1, text);
    } catch (...) {
      SetError(1, job->unknown_text);
    }
  } catch (...) {
    // Storing the message failed (no memory); the flag alone tells.
    std::lock_guard lock(error_mutex_);
    error_flag_ = 1;
  }
  {
    // A later job may have taken over the progress display meanwhile.
    std::lock_guard lock(progress_mutex_);
    if (running_job_ == job) running_job_.reset();
  }
  job->finished = true;
}

void CPiStartPoint::SetError(int32_t flag, std::u16string message) {
  std::lock_guard lock(error_mutex_);
  error_flag_ = flag;
  error_message_ = std::move(message);
}

void CPiStartPoint::ClearErrorFlag() {
  std::lock_guard lock(error_mutex_);
  error_flag_ = 0;
}

void CPiStartPoint::JoinFinishedJobs() {
  for (auto it = threads_.begin(); it != threads_.end();) {
    if (it->job->finished) {
      it->thread.join();
      it = threads_.erase(it);
    } else {
      ++it;
    }
  }
}

void CPiStartPoint::ExecuteW(std::u16string_view statement, bool blocking) {
  Public("ExecuteW", [&] {
    Trace(defs_.TraceLevel1(), kExecuteTag, "Executing Statement: %s",
          Utf16ToUtf8(MaskStatementForTrace(statement)));
    Run(blocking, kUnknownInThreadFunc,
        [text = std::u16string(statement)](CommandExecution& execution) {
          execution.ExecuteStatement(text);
        });
  });
}

void CPiStartPoint::WaitForExecute() {
  Public("WaitForExecute", [&] {
    // A second caller waits until the first has joined what it took.
    std::lock_guard wait(wait_mutex_);
    std::vector<JobThread> taken;
    {
      std::lock_guard lock(threads_mutex_);
      taken.swap(threads_);
    }
    for (JobThread& t : taken) t.thread.join();
  });
}

int32_t CPiStartPoint::GetProgress() const {
  return Public("GetProgress", [&] {
    std::lock_guard lock(progress_mutex_);
    if (!running_job_) return 100;
    // 100 is kept for the moment the job has ended, so a host that sees it
    // reads the job's final error state.
    return std::min(running_job_->defs.GetProgress(), 99);
  });
}

int32_t CPiStartPoint::GetErrorNumber() const {
  return Public("GetErrorNumber", [&] {
    std::lock_guard lock(error_mutex_);
    return error_flag_;
  });
}

std::u16string CPiStartPoint::GetErrorMsg() const {
  return Public("GetErrorMsg", [&] {
    std::lock_guard lock(error_mutex_);
    return error_message_;
  });
}

std::u16string CPiStartPoint::TakeErrorMsg() {
  return Public("GetErrorMsg", [&] {
    std::lock_guard lock(error_mutex_);
    return std::exchange(error_message_, std::u16string());
  });
}

// --- connection, group, data path, object name ---

void CPiStartPoint::ConnectToDatabase(std::string_view dsn, std::string_view user,
                                      std::string_view password) {
  Public("ConnectToDatabase", [&] {
    defs_.SetConnectionDsn(dsn, user, password);
    try {
      CShareDatabase database(defs_);
      database.Connect();
      database.Disconnect();
    } catch (const CExceptionBase& e) {
      throw CPiStartPointException::Numbered(kErrConnectToDatabase, "ConnectToDatabase", &e);
    }
  });
}

void CPiStartPoint::SetDBConnectionString(std::string_view connection_string,
                                          std::string_view display_name) {
  Public("SetDBConnectionString", [&] { defs_.SetConnection(connection_string, display_name); });
}

int32_t CPiStartPoint::TestDBConnection() {
  return Public("TestDBConnection", [&] {
    try {
      CShareDatabase database(defs_);
      database.Connect();
      database.Disconnect();
      return 0;
    } catch (const CExceptionBase& e) {
      Trace(defs_.TraceLevel1(), "PILIB.CPiStartPoint.TestDBConnection",
            "Connection test failed: %S", e.GetFullText(200));
      return 1;
    }
  });
}

void CPiStartPoint::SetGroup(std::string_view group) {
  Public("SetGroup", [&] {
    RequirePlainName<CPiStartPointException>("group", group, "SetGroup");
    defs_.SetGroup(group);
  });
}

void CPiStartPoint::SetDataPath(std::string_view path) {
  Public("SetDataPath", [&] {
    if (!platform::IsDirectory(std::string(path))) {
      throw CPiStartPointException::Text("Data path does not exist: %S", "SetDataPath", nullptr,
                                         path);
    }
    defs_.SetDataPath(path);
  });
}

void CPiStartPoint::SetCurrentObjectName(std::string_view name) {
  Public("SetCurrentObjectName", [&] {
    std::lock_guard lock(settings_mutex_);
    object_name_ = name;
  });
}

// --- builds and drops through the API ---

void CPiStartPoint::CreateFindex(std::string_view name, std::string_view sql_select,
                                 std::string_view columns, std::string_view key_column,
                                 bool blocking, std::string_view date_time_update_key) {
  constexpr const char* kMethod = "CreateFindex";
  Public(kMethod, [&] {
    RequireNameWithoutSpaces(Utf8ToUtf16(name), kSpacesInIndexName, kMethod);
    CIndexHeader definition;
    TakeSnapshot().index_options.CopyTo(definition);
    definition.IndexName = name;
    definition.SqlUsedAsTable = 1;
    definition.SqlSelect = sql_select;
    definition.KeyColumn = key_column;
    definition.DateTimeKeyColumn = date_time_update_key;
    ParseFindexColumns(Utf8ToUtf16(columns), definition.Columns, kMethod);
    RequireBuildableFindex(definition, defs_, kMethod);
    Run(blocking, kUnknownInCreateThread,
        [definition](CommandExecution& execution) { execution.CreateFindex(definition); });
  });
}

void CPiStartPoint::CreateOrder(std::string_view name, std::string_view sql_select,
                                std::string_view columns, std::string_view key_column,
                                bool blocking, std::string_view date_time_update_key) {
  constexpr const char* kMethod = "CreateOrder";
  Public(kMethod, [&] {
    RequireNameWithoutSpaces(Utf8ToUtf16(name), kSpacesInOrderName, kMethod);
    COrderInfo definition;
    TakeSnapshot().order_options.CopyTo(definition);
    definition.OrderName = name;
    definition.SqlUsedAsTable = 1;
    definition.SqlSelect = sql_select;
    definition.KeyColumn = key_column;
    definition.DateTimeKeyColumn = date_time_update_key;
    ParseOrderColumns(Utf8ToUtf16(columns), definition.Columns, kMethod);
    RequireBuildableOrder(definition, defs_, kMethod);
    Run(blocking, kUnknownInCreateThread,
        [definition](CommandExecution& execution) { execution.CreateOrder(definition); });
  });
}

void CPiStartPoint::DropFindexW(std::u16string_view name) {
  Public("DropFindexW", [&] {
    // The name is used as it is: put into a statement, a name with a blank
    // would drop the findex named by its first word.
    const std::string findex = Utf16ToUtf8(name);
    Trace(defs_.TraceLevel1(), kExecuteTag, "Executing Statement: drop findex %s", findex);
    Run(true, kUnknownInThreadFunc,
        [&findex](CommandExecution& execution) { execution.DropFindex(findex); });
  });
}

void CPiStartPoint::DropOrderW(std::u16string_view name) {
  Public("DropOrderW", [&] {
    const std::string order = Utf16ToUtf8(name);
    Trace(defs_.TraceLevel1(), kExecuteTag, "Executing Statement: drop order %s", order);
    Run(true, kUnknownInThreadFunc,
        [&order](CommandExecution& execution) { execution.DropOrder(order); });
  });
}

// --- information ---

bool CPiStartPoint::FindexExist(std::string_view name, std::string_view group) {
  constexpr const char* kMethod = "FindexExist";
  return Public(kMethod, [&] {
    RequirePlainName<CPiStartPointException>("group", group, kMethod);
    defs_.SetGroup(group);
    RequirePlainName<CPiStartPointException>("findex", name, kMethod);
    if (!FindexFilesExist(defs_, name)) return false;
    try {
      ReadFindexHeaderShared(defs_, name);
      return true;
    } catch (const CExceptionBase& e) {
      Trace(defs_.TraceLevel2(), "PILIB.CPiStartPoint.FindexExist", "Findex does not open: %S",
            e.GetFullText(200));
      return false;
    }
  });
}

std::string CPiStartPoint::GetFindexInfo(int32_t info) {
  constexpr const char* kMethod = "GetFindexInfo";
  return Public(kMethod,
                [&] { return FindexInformation(defs_, CurrentObjectName(kMethod), info); });
}

std::string CPiStartPoint::GetOrderInfo(int32_t info) {
  constexpr const char* kMethod = "GetOrderInfo";
  return Public(kMethod, [&] {
    const std::string name = CurrentObjectName(kMethod);
    return OrderInformation(order_files::ReadInfoShared(defs_, name), info);
  });
}

// --- options ---

void CPiStartPoint::SetIndexLanguageOptions(int32_t language, bool use_stemming, bool use_phonetics,
                                            bool use_stop_words, bool strip_accents,
                                            bool use_character_translation) {
  Public("SetIndexLanguageOptions", [&] {
    std::lock_guard lock(settings_mutex_);
    index_options_.Language = language;
    index_options_.LanguageFlags =
        Bit(use_stemming, kIloUseStemming) | Bit(use_phonetics, kIloUsePhonetic) |
        Bit(use_stop_words, kIloUseStopWords) | Bit(strip_accents, kIloRemoveAccent) |
        Bit(use_character_translation, kIloUseCharacterTranslation);
  });
}

void CPiStartPoint::SetIndexGeneralOptions(bool support_score, bool support_phrases,
                                           bool remove_html,
                                           const std::optional<std::u16string>& separators,
                                           bool add_default_separators,
                                           bool save_database_connection, int32_t index_max_size,
                                           int32_t index_start_value) {
  Public("SetIndexGeneralOptions", [&] {
    std::lock_guard lock(settings_mutex_);
    index_options_.GeneralFlags =
        Bit(support_score, kIgoSupportScore) | Bit(support_phrases, kIgoSupportPhrases) |
        Bit(remove_html, kIgoRemoveHtml) | Bit(add_default_separators, kIgoUseDefaultSeparators) |
        Bit(save_database_connection, kIgoSaveDatabaseConnection);
    if (separators) index_options_.Separators = *separators;
    index_options_.IndexMaxSize = index_max_size;
    index_options_.IndexStartValue = index_start_value;
  });
}

void CPiStartPoint::SetIndexUpdateOptions(int32_t update_support, bool use_date_time_key,
                                          bool use_date_time_fraction) {
  Public("SetIndexUpdateOptions", [&] {
    std::lock_guard lock(settings_mutex_);
    index_options_.UpdateSupport = update_support;
    index_options_.UpdateFlags = Bit(use_date_time_key, kUpdateUseDateTimeKey) |
                                 Bit(use_date_time_fraction, kUpdateUseDateTimeFraction);
  });
}

void CPiStartPoint::SetOrderGeneralOptions(bool save_database_connection, bool ignore_case,
                                           const std::optional<std::u16string>& ignore_characters) {
  Public("SetOrderGeneralOptions", [&] {
    std::lock_guard lock(settings_mutex_);
    order_options_.GeneralFlags = Bit(save_database_connection, kOgoSaveDatabaseConnection) |
                                  Bit(ignore_case, kOgoIgnoreCase);
    if (ignore_characters) order_options_.IgnoreChars = *ignore_characters;
  });
}

void CPiStartPoint::SetOrderUpdateOptions(int32_t update_support, bool use_date_time_key,
                                          bool use_date_time_fraction) {
  Public("SetOrderUpdateOptions", [&] {
    std::lock_guard lock(settings_mutex_);
    order_options_.UpdateSupport = update_support;
    order_options_.UpdateFlags = Bit(use_date_time_key, kUpdateUseDateTimeKey) |
                                 Bit(use_date_time_fraction, kUpdateUseDateTimeFraction);
  });
}

IndexOptions CPiStartPoint::StoredIndexOptions(const char* method) {
  return IndexOptions::FromHeader(ReadFindexHeaderShared(defs_, CurrentObjectName(method)));
}

OrderOptions CPiStartPoint::StoredOrderOptions(const char* method) {
  return OrderOptions::FromInfo(order_files::ReadInfoShared(defs_, CurrentObjectName(method)));
}

// One option of the current options (get_default_value) or of those the
// current object was built with, rendered by render.
template <class Options>
std::string CPiStartPoint::OptionText(const char* method,
                                      std::string (*render)(const Options&, int32_t),
                                      int32_t option, bool get_default_value) {
  return Public(method, [&] {
    if constexpr (std::is_same_v<Options, IndexOptions>) {
      return render(get_default_value ? CurrentIndexOptions() : StoredIndexOptions(method), option);
    } else {
      return render(get_default_value ? CurrentOrderOptions() : StoredOrderOptions(method), option);
    }
  });
}

std::string CPiStartPoint::GetIndexLanguageOption(int32_t option, bool get_default_value) {
  return OptionText("GetIndexLanguageOption", &IndexLanguageOptionText, option, get_default_value);
}

std::string CPiStartPoint::GetIndexGeneralOption(int32_t option, bool get_default_value) {
  return OptionText("GetIndexGeneralOption", &IndexGeneralOptionText, option, get_default_value);
}

std::string CPiStartPoint::GetIndexUpdateOption(int32_t option, bool get_default_value) {
  return OptionText("GetIndexUpdateOption", &IndexUpdateOptionText, option, get_default_value);
}

std::string CPiStartPoint::GetOrderGeneralOption(int32_t option, bool get_default_value) {
  return OptionText("GetOrderGeneralOption", &OrderGeneralOptionText, option, get_default_value);
}

std::string CPiStartPoint::GetOrderUpdateOption(int32_t option, bool get_default_value) {
  return OptionText("GetOrderUpdateOption", &OrderUpdateOptionText, option, get_default_value);
}

void CPiStartPoint::LoadDefaultIndexOptions() {
  Public("LoadDefaultIndexOptions", [&] {
    IndexOptions options;  // the documented defaults
    LoadIndexOptionFiles(defs_, options);
    std::lock_guard lock(settings_mutex_);
    index_options_ = std::move(options);
  });
}

void CPiStartPoint::SaveDefaultIndexOptions() {
  Public("SaveDefaultIndexOptions", [&] { SaveIndexOptionFiles(defs_, CurrentIndexOptions()); });
}

void CPiStartPoint::LoadDefaultOrderOptions() {
  Public("LoadDefaultOrderOptions", [&] {
    OrderOptions options;
    LoadOrderOptionFiles(defs_, options);
    std::lock_guard lock(settings_mutex_);
    order_options_ = std::move(options);
  });
}

void CPiStartPoint::SaveDefaultOrderOptions() {
  Public("SaveDefaultOrderOptions", [&] { SaveOrderOptionFiles(defs_, CurrentOrderOptions()); });
}

}  // namespace qm
