// The C interface: every method of both objects called by dispatch
// identifier, argument conversions and their refusals, results and by-ref
// results, the error information, the unload count, and the type library
// against the dispatch tables.
#include "quillmere/quillmere.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstring>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "api/command_fixture.h"
#include "api/dispatch_table.h"
#include "api/type_library.h"
#include "base/error_messages.h"

namespace qm {
namespace {

qm_variant Text(const char* text) {
  qm_variant v{};
  v.type = QM_VT_UTF8;
  v.value.utf8.data = text;
  return v;
}
qm_variant Int(int32_t n) {
  qm_variant v{};
  v.type = QM_VT_I4;
  v.value.i4 = n;
  return v;
}
qm_variant Bool(int16_t b) {
  qm_variant v{};
  v.type = QM_VT_BOOL;
  v.value.boolean = b;
  return v;
}
qm_variant Real(double d) {
  qm_variant v{};
  v.type = QM_VT_R8;
  v.value.r8 = d;
  return v;
}
qm_variant Null() { return qm_variant{}; }

// A result as text: numbers in decimal, booleans as their 16-bit value.
std::string Shown(const qm_variant& v) {
  switch (v.type) {
    case QM_VT_I4: return std::to_string(v.value.i4);
    case QM_VT_BOOL: return std::to_string(v.value.boolean);
    case QM_VT_R8: return std::to_string(v.value.r8);
    case QM_VT_UTF8: return std::string(v.value.utf8.data, v.value.utf8.length);
    default: return "<empty>";
  }
}

struct Outcome {
  int32_t hr = 0;
  std::string shown;  // the result, or the error description on failure
};

class CInterfaceTest : public test::CommandFixture {
 protected:
  void SetUp() override {
    CommandFixture::SetUp();
    UseShippedMessages();
    UseShippedLanguages();
    Sql({"create table docs (id integer, body varchar(100), n integer)",
         "insert into docs values (1, 'red wine', 3)", "insert into docs values (2, 'red beer', 1)",
         "insert into docs values (3, 'white wine', 2)"});
    ASSERT_EQ(qm_create("QuillmereAPI.APICommand", &command_), QM_S_OK);
    ASSERT_EQ(qm_create("quillmereapi.apisearch.1", &search_), QM_S_OK) << "any letter case";
    data_ = home_.Data();
    connection_ = SqliteConnection();
  }

  void TearDown() override {
    qm_release(command_);
    qm_release(search_);
    CommandFixture::TearDown();
  }

  Outcome Call(qm_object* object, const char* method, std::vector<qm_variant> args) {
    int32_t dispid = 0;
    EXPECT_EQ(qm_get_dispid(object, method, &dispid), QM_S_OK) << method;
    qm_variant result{};
    Outcome outcome;
    outcome.hr = qm_invoke(object, dispid, args.data(), static_cast<int32_t>(args.size()), &result);
    outcome.shown = outcome.hr == QM_S_OK ? Shown(result) : qm_error_description();
    qm_variant_clear(&result);
    return outcome;
  }

  qm_object* command_ = nullptr;
  qm_object* search_ = nullptr;
  std::string data_;
  std::string connection_;
};

struct Row {
  int32_t dispid;
  const char* name;
  std::vector<qm_variant> args;
  int32_t hr;
  std::string expected;  // the result ("~text": a result that holds text); for a failure,
                         // text the description holds
};

// Runs the rows in order on one object and checks that they cover every
// method of its interface.
void RunRows(qm_object* object, const DispatchTable& table, const std::vector<Row>& rows) {
  std::set<int32_t> covered;
  for (const Row& row : rows) {
    std::vector<qm_variant> args = row.args;
    qm_variant result{};
    const int32_t hr = qm_invoke(object, row.dispid, args.data(),
                                 static_cast<int32_t>(args.size()), &result);
    const std::string shown = hr == QM_S_OK ? Shown(result) : qm_error_description();
    qm_variant_clear(&result);
    const char* name = nullptr;
    ASSERT_EQ(qm_method_name(object, row.dispid, &name, nullptr), QM_S_OK);
    EXPECT_STREQ(name, row.name) << row.dispid;
    EXPECT_EQ(hr, row.hr) << row.name << ": " << shown;
    if (row.hr == QM_S_OK && row.expected.starts_with("~")) {
      EXPECT_NE(shown.find(row.expected.substr(1)), std::string::npos) << row.name << ": " << shown;
    } else if (row.hr == QM_S_OK) {
      EXPECT_EQ(shown, row.expected) << row.name;
    } else {
      EXPECT_NE(shown.find(row.expected), std::string::npos) << row.name << ": " << shown;
    }
    covered.insert(row.dispid);
  }
  EXPECT_EQ(covered.size(), table.Methods().size());
}

TEST_F(CInterfaceTest, EveryCommandObjectMethodByDispatchIdentifier) {
  const std::string select = "select id, body from docs";
  const int32_t ok = QM_S_OK;
  const int32_t failed = QM_DISP_E_EXCEPTION;
  RunRows(command_, APICommandDispatch(), {
      {5, "SetDataPath", {Text(data_.c_str())}, ok, "<empty>"},
      {4, "SetGroup", {Text("PUBLIC")}, ok, "<empty>"},
      {23, "SetDBConnectionStringEx", {Text(connection_.c_str()), Text("test")}, ok, "<empty>"},
      {22, "SetDBConnectionString", {Text(connection_.c_str())}, ok, "<empty>"},
      {16, "TestDBConnection", {}, ok, "-1"},
      {28, "SetIndexLanguageOptions", {Int(2), Bool(0), Bool(0), Bool(0), Bool(0), Bool(0)}, ok,
       "<empty>"},
      {29, "SetIndexGeneralOptions", {Bool(-1), Bool(-1), Bool(0), Null(), Bool(-1), Bool(-1)},
       ok, "<empty>"},
      {30, "SetIndexGeneralOptionsEx",
       {Bool(-1), Bool(-1), Bool(0), Text(" ,"), Bool(-1), Bool(-1), Int(0), Int(0)}, ok,
       "<empty>"},
      {31, "SetIndexUpdateOptions", {Int(1), Bool(0), Bool(0)}, ok, "<empty>"},
      {32, "SetOrderGeneralOptions", {Bool(-1), Bool(-1), Text("-")}, ok, "<empty>"},
      {33, "SetOrderUpdateOptions", {Int(0), Bool(0), Bool(0)}, ok, "<empty>"},
      {34, "GetIndexLanguageOption", {Int(iloLanguage), Bool(-1)}, ok, "2"},
      {35, "GetIndexGeneralOption", {Int(igoSupportScore), Bool(-1)}, ok, "1"},
      {36, "GetIndexUpdateOption", {Int(iuoUpdateSupport), Bool(-1)}, ok, "1"},
      {37, "GetOrderGeneralOption", {Int(ogoIgnoreChars), Bool(-1)}, ok, "-"},
      {38, "GetOrderUpdateOption", {Int(ouoUpdateSupport), Bool(-1)}, ok, "0"},
      {42, "SaveDefaultIndexOptions", {}, ok, "<empty>"},
      {41, "LoadDefaultIndexOptions", {}, ok, "<empty>"},
      {40, "SaveDefaultOrderOptions", {}, ok, "<empty>"},
      {39, "LoadDefaultOrderOptions", {}, ok, "<empty>"},
      {2, "ExecuteEx", {Text("CREATE FINDEX Docs ON TABLE docs COLUMNS body KEY id"), Bool(-1)},
       ok, "<empty>"},
      {18, "CreateFindex", {Text("Spare"), Text(select.c_str()), Text("body"), Text("id")}, ok,
       "<empty>"},
      {19, "CreateFindexEx",
       {Text("Spare2"), Text(select.c_str()), Text("body"), Text("id"), Int(-1), Null()}, ok,
       "<empty>"},
      {20, "CreateOrder", {Text("Facts"), Text("select id, n from docs"), Text("n"), Text("id")},
       ok, "<empty>"},
      {21, "CreateOrderEx",
       {Text("Facts2"), Text("select id, n from docs"), Text("n"), Text("id"), Bool(-1), Null()},
       ok, "<empty>"},
      {15, "FindexExist", {Text("Spare"), Text("PUBLIC")}, ok, "-1"},
      {14, "DropFindex", {Text("Spare")}, ok, "<empty>"},
      {17, "DropOrder", {Text("Facts2")}, ok, "<empty>"},
      {43, "SetCurrentObjectName", {Text("Docs")}, ok, "<empty>"},
      {12, "GetFindexInfo", {Int(idxKeyCount)}, ok, "3"},
      {13, "GetOrderInfo", {Int(odrKeyName)}, failed, "DOCS.sri"},
      {9, "GetErrorNumber", {}, ok, "0"},
      {10, "GetErrorMsg", {}, ok, ""},
      {11, "GetProgress", {}, ok, "100"},
      {24, "GetVersion", {}, ok, "6.14"},
      {25, "SystemOverwrite", {Text("x")}, ok, "<empty>"},
      {8, "SetProcessRights", {}, ok, "<empty>"},
      {3, "ConnectToDatabase", {Text("NoSuchDsn"), Text("u"), Text("p")}, failed,
       "Could not connect to the database"},
      {6, "ConnectToServer", {Text("far.example")}, failed, "not available in this build"},
      {7, "DisconnectFromServer", {}, failed, "not available in this build"},
      {26, "PushIndex", {Text("Docs")}, failed, "not available in this build"},
      {27, "PushOrder", {Text("Facts")}, failed, "not available in this build"},
      // Execute runs in the background: its failure shows in the error number.
      {1, "Execute", {Text("DROP FINDEX Nope")}, ok, "<empty>"},
  });
  Outcome progress;
  for (int i = 0; i < 500 && (progress = Call(command_, "GetProgress", {})).shown != "100"; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  EXPECT_EQ(Call(command_, "GetErrorNumber", {}).shown, "1");
}

TEST_F(CInterfaceTest, EverySearchObjectMethodByDispatchIdentifier) {
  ASSERT_EQ(Call(command_, "SetDataPath", {Text(data_.c_str())}).hr, QM_S_OK);
  ASSERT_EQ(Call(command_, "SetDBConnectionStringEx", {Text(connection_.c_str()), Text("t")}).hr,
            QM_S_OK);
  ASSERT_EQ(Call(command_, "SetIndexGeneralOptions",
                 {Bool(-1), Bool(-1), Bool(0), Null(), Bool(-1), Bool(-1)})
                .hr,
            QM_S_OK);
  ASSERT_EQ(Call(command_, "ExecuteEx",
                 {Text("CREATE FINDEX Docs ON TABLE docs COLUMNS body KEY id"), Bool(-1)})
                .hr,
            QM_S_OK)
      << qm_error_description();
  ASSERT_EQ(Call(command_, "ExecuteEx",
                 {Text("CREATE ORDER Facts ON TABLE docs COLUMNS n KEY id"), Bool(-1)})
                .hr,
            QM_S_OK)
      << qm_error_description();
  const int32_t ok = QM_S_OK;
  const int32_t failed = QM_DISP_E_EXCEPTION;
  const char* red = "SELECT id FROM docs WHERE [Docs='red']";
  RunRows(search_, APISearchDispatch(), {
      {43, "NetworkStartup", {}, ok, "<empty>"},
      {14, "SetDataPath", {Text(data_.c_str())}, ok, "<empty>"},
      {13, "SetGroup", {Text("PUBLIC")}, ok, "<empty>"},
      {36, "SetCacheSize", {Int(0)}, ok, "<empty>"},
      {4, "GetVersion", {}, ok, "6.14"},
      {32, "ValidateStatement", {Text(red)}, ok, "'RED'"},
      {28, "GetFindexWords", {Text("Docs"), Int(1), Int(9)}, ok, "BEER;RED;WHITE;WINE"},
      {29, "GetFindexWordsEx", {Text("Docs"), Int(1), Int(9), Text("w*"), Text("|")}, ok,
       "WHITE|WINE"},
      {30, "GetTotalWords", {}, ok, "2"},
      {31, "GetNumWords", {}, ok, "9"},
      {1, "Execute", {Text(red)}, ok, "<empty>"},
      // -1 adds to the open result set; 1 (passed as an integer) does not.
      {2, "ExecuteEx", {Text("SELECT id FROM docs WHERE [Docs='wine']"), Int(1)}, failed,
       "A result set is already open"},
      {2, "ExecuteEx", {Text("SELECT id FROM docs WHERE [Docs='wine']"), Bool(-1)}, ok,
       "<empty>"},
      {5, "GetTotal", {}, ok, "4"},
      {6, "GetNum", {}, ok, "4"},
      {8, "GetTruncInfo", {}, ok, "0"},
      {37, "IsTruncated", {}, ok, "0"},
      {3, "GetSql", {Int(0), Int(0)}, ok,
       "SELECT id FROM docs WHERE id in (1,2)  UNION ALL SELECT id FROM docs WHERE id in (1,3) "},
      {20, "GetRawKeyString", {Int(0), Int(0)}, ok, "(1,3)"},
      {21, "GetRawKeyStringEx", {Int(1), Int(2), Int(1)}, ok, "(1,2)"},
      {39, "GetRawKeyFileEx", {Int(0), Int(0), Int(9)}, failed, "Command number not executed"},
      {41, "GetSqlOrderString", {}, ok, "id ASC"},
      {42, "GetSqlKeyName", {}, ok, "id"},
      {24, "SetLimits", {Int(1), Int(4)}, ok, "<empty>"},
      {7, "Close", {}, ok, "<empty>"},
      {1, "Execute", {Text("SELECT id FROM docs WHERE [Docs='red' OR Docs='wine']")}, ok,
       "<empty>"},
      {40, "SetNumericOption", {Text("SCORE_RETURN"), Int(2)}, ok, "<empty>"},
      {16, "OrderBy", {Text("FACTS.N DESC")}, ok, "<empty>"},
      {17, "OrderByEx", {Text("SCORE"), Bool(0)}, ok, "<empty>"},
      // Key 1 holds both words: 202 + 202.
      {33, "GetMaxScore", {}, ok, "404"},
      {34, "AdjustScore", {Real(100), Real(100)}, ok, "<empty>"},
      {35, "AdjustScoreEx", {Int(0), Int(0), Int(0), Int(0), Bool(1)}, ok, "<empty>"},
      {38, "GetRawKeyFile", {Int(1), Int(1)}, ok, "~/WorkData/tmpxxxx_60_"},
      {16, "OrderBy", {Text("FACTS.N DESC")}, ok, "<empty>"},
      {18, "CollectGroups", {}, ok, "<empty>"},
      {25, "GetTotalGroups", {}, ok, "3"},
      {12, "GetValue", {Text("FACTS.N")}, ok, "3"},
      {11, "GetCount", {Text("FACTS.N")}, ok, "1"},
      {9, "MoveNext", {}, ok, "<empty>"},
      {10, "MovePrev", {}, ok, "<empty>"},
      {19, "IsEOB", {}, ok, "0"},
      // The window is still row 1 alone, so one group.
      {15, "GetGroupString", {Text("FACTS.N")}, ok, "(3)"},
      {27, "GetGroupSql", {Int(2), Int(1), Text("FACTS.N")}, ok,
       "SELECT id FROM docs WHERE id in (3)  order by FACTS.N DESC"},
      {26, "GetNumGroups", {}, ok, "1"},
      {22, "ConnectToServer", {Text("far.example")}, failed, "not available in this build"},
      {23, "DisconnectFromServer", {}, failed, "not available in this build"},
      {44, "NetworkCleanup", {}, ok, "<empty>"},
  });
}

TEST_F(CInterfaceTest, ArgumentsAreCheckedBeforeAnyCallAndNothingCrashes) {
  int32_t dispid = 0;
  EXPECT_EQ(qm_get_dispid(search_, "getrawkeystring", &dispid), QM_S_OK);
  EXPECT_EQ(dispid, 20);
  struct Case {
    const char* what;
    int32_t dispid;
    std::vector<qm_variant> args;
    int32_t hr;
    std::string message;
  };
  const Case cases[] = {
      {"unknown identifier", 45, {}, QM_DISP_E_MEMBERNOTFOUND,
       "IAPISearch has no method with dispatch identifier 45"},
      {"identifier 0", 0, {}, QM_DISP_E_MEMBERNOTFOUND,
       "IAPISearch has no method with dispatch identifier 0"},
      {"too few", 3, {Int(1)}, QM_DISP_E_BADPARAMCOUNT, "GetSql takes 2 arguments, 1 given"},
      {"too many", 7, {Int(1)}, QM_DISP_E_BADPARAMCOUNT, "Close takes 0 arguments, 1 given"},
      {"text for a number", 24, {Text("1"), Int(1)}, QM_DISP_E_TYPEMISMATCH,
       "Argument 1 (Start) of SetLimits must be an integer"},
      {"fraction for an integer", 24, {Real(1.5), Int(1)}, QM_DISP_E_TYPEMISMATCH,
       "Argument 1 (Start) of SetLimits must be an integer"},
      {"number for a text", 14, {Int(4)}, QM_DISP_E_TYPEMISMATCH,
       "Argument 1 (Path) of SetDataPath must be a text"},
      {"double for a boolean", 2, {Text("x"), Real(1)}, QM_DISP_E_TYPEMISMATCH,
       "Argument 2 (AddNewResultSet) of ExecuteEx must be a boolean"},
      {"text without data", 14, {[] {
         qm_variant v = Text(nullptr);
         v.value.utf8.length = 3;
         return v;
       }()},
       QM_DISP_E_TYPEMISMATCH, "Argument 1 (Path) of SetDataPath must be a text"},
  };
  for (const Case& c : cases) {
    std::vector<qm_variant> args = c.args;
    qm_variant result{};
    EXPECT_EQ(qm_invoke(search_, c.dispid, args.data(), static_cast<int32_t>(args.size()), &result),
              c.hr)
        << c.what;
    EXPECT_EQ(qm_error_description(), c.message) << c.what;
    EXPECT_STREQ(qm_error_source(), "QuillmereAPI") << c.what;
    EXPECT_EQ(result.type, QM_VT_EMPTY) << c.what;
  }
  EXPECT_EQ(qm_get_dispid(search_, "NoSuchMethod", &dispid), QM_DISP_E_UNKNOWNNAME);
  EXPECT_STREQ(qm_error_description(), "IAPISearch has no method named NoSuchMethod");
  EXPECT_EQ(qm_method_name(search_, 45, nullptr, nullptr), QM_DISP_E_MEMBERNOTFOUND);
  EXPECT_STREQ(qm_error_description(), "IAPISearch has no method with dispatch identifier 45");
  EXPECT_EQ(qm_method_parameter(search_, 3, 3, nullptr, nullptr, nullptr), QM_E_INVALIDARG);
  EXPECT_STREQ(qm_error_description(), "GetSql has no parameter 3");
  EXPECT_EQ(qm_invoke(nullptr, 1, nullptr, 0, nullptr), QM_E_POINTER);
  EXPECT_EQ(qm_invoke(search_, 24, nullptr, 2, nullptr), QM_E_POINTER);
  qm_object* none = nullptr;
  EXPECT_EQ(qm_create("QuillmereAPI.APIOther", &none), QM_REGDB_E_CLASSNOTREG);
  EXPECT_EQ(none, nullptr);
  EXPECT_EQ(qm_create(nullptr, &none), QM_E_POINTER);

  // A failing method: its own text and the object's ProgID as the source;
  // the next call that succeeds leaves no error information.
  qm_variant total{};
  EXPECT_EQ(qm_invoke(search_, 5, nullptr, 0, &total), QM_DISP_E_EXCEPTION);
  EXPECT_EQ(std::string(qm_error_description()),
            "No open result set (Module:GiStartPoint,Method:GetTotal)\r\n");
  EXPECT_STREQ(qm_error_source(), "QuillmereAPI.APISearch.1");
  EXPECT_EQ(qm_invoke(search_, 4, nullptr, 0, &total), QM_S_OK);
  EXPECT_STREQ(qm_error_description(), "");
  qm_variant_clear(&total);
}

TEST_F(CInterfaceTest, ResultsComeBackInTheResultAndInALastByRefArgument) {
  // UTF-16 in, UTF-8 out; the by-ref argument receives the result too.
  const std::u16string path16 = Utf8ToUtf16(data_);
  qm_variant path{};
  path.type = QM_VT_UTF16;
  path.value.utf16.data = reinterpret_cast<const uint16_t*>(path16.data());
  path.value.utf16.length = path16.size();
  ASSERT_EQ(qm_invoke(search_, 14, &path, 1, nullptr), QM_S_OK) << qm_error_description();
  qm_variant statement = Text("SELECT id FROM docs WHERE [Nope='x']");
  EXPECT_EQ(qm_invoke(search_, 32, &statement, 1, nullptr), QM_DISP_E_EXCEPTION);
  EXPECT_NE(std::string(qm_error_description()).find(data_ + "Groups/PUBLIC/Indexes/NOPE.sdx"),
            std::string::npos)
      << "the UTF-16 path is the data path: " << qm_error_description();

  qm_variant version = Null();
  version.byref = 1;
  qm_variant result{};
  ASSERT_EQ(qm_invoke(search_, 4, &version, 1, &result), QM_S_OK) << qm_error_description();
  EXPECT_EQ(Shown(version), "6.14");
  EXPECT_EQ(Shown(result), "6.14");
  EXPECT_EQ(version.byref, 1);
  EXPECT_EQ(version.owned, 1);
  qm_variant_clear(&version);
  qm_variant_clear(&result);
  EXPECT_EQ(result.type, QM_VT_EMPTY);
  EXPECT_EQ(version.byref, 1) << "clearing keeps the by-ref mark";
  // A by-ref argument in place of an in argument is still a count error.
  qm_variant lone = Null();
  lone.byref = 1;
  EXPECT_EQ(qm_invoke(search_, 7, &lone, 1, nullptr), QM_DISP_E_BADPARAMCOUNT) << "Close";
}

TEST_F(CInterfaceTest, ObjectsAreCountedForTheUnloadCheck) {
  const int32_t before = qm_object_count();
  EXPECT_EQ(qm_can_unload_now(), QM_S_FALSE) << "the fixture's two objects live";
  qm_object* extra = nullptr;
  ASSERT_EQ(qm_create(QM_PROGID_APISEARCH_INDEPENDENT, &extra), QM_S_OK);
  EXPECT_STREQ(qm_prog_id(extra), QM_PROGID_APISEARCH);
  EXPECT_EQ(qm_object_count(), before + 1);
  EXPECT_EQ(qm_add_ref(extra), 2);
  EXPECT_EQ(qm_release(extra), 1);
  EXPECT_EQ(qm_object_count(), before + 1);
  EXPECT_EQ(qm_release(extra), 0);
  EXPECT_EQ(qm_object_count(), before);
  qm_release(command_);
  qm_release(search_);
  command_ = search_ = nullptr;
  EXPECT_EQ(qm_can_unload_now(), QM_S_OK);
  EXPECT_EQ(qm_lock_server(1), 1);
  EXPECT_EQ(qm_can_unload_now(), QM_S_FALSE);
  EXPECT_EQ(qm_lock_server(0), 0);
  EXPECT_EQ(qm_can_unload_now(), QM_S_OK);
}

TEST(TypeLibrary, TheInstalledDescriptionIsTheDispatchTables) {
  // data/quillmere-api.json is written by `quillmere typelib`; a method or
  // parameter changed without writing it again fails here.
  EXPECT_EQ(test::ReadFile(std::string(QM_SOURCE_DATA_DIR) + "quillmere-api.json"),
            TypeLibraryJson());
  for (const DispatchTable* table : {&APICommandDispatch(), &APISearchDispatch()}) {
    int32_t dispid = 0;
    for (const DispatchMethod& method : table->Methods()) {
      EXPECT_EQ(method.dispid, ++dispid) << method.name;
      for (const DispatchParameter& parameter : method.parameters) {
        EXPECT_FALSE(parameter.name.empty()) << method.name;
      }
    }
  }
}

}  // namespace
}  // namespace qm
