// Repositories, collectors and definitions as record files written here from
// their byte layout, and the catalogue view that resolves a name through them
// to findexes built from SQLite.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "sources/share_collector.h"
#include "sources/share_repository.h"
#include "search/lookup_fixture.h"
#include "search/record_writer.h"

namespace qm {
namespace {

using test::RecordWriter;

class RepositoryTest : public test::LookupFixture {
 protected:
  std::string Folder(const char* kind) { return GroupFolder() + kind + "/"; }

  void WriteRepository(const std::string& name, const std::vector<std::string>& members,
                       int32_t declared = -1) {
    RecordWriter r;
    r.Int(1).Text("x").Date(2024, 1, 2).Text("y").Text("").Date(2024, 1, 3).Int(7);
    r.Int(declared >= 0 ? declared : static_cast<int32_t>(members.size()));
    for (const std::string& m : members) r.Text(m).Int(5);
    test::WriteFile(Folder("Repositories") + name + ".rep", r.Block());
  }

  // A collector of kind 5 (two optional texts) with no groups or entries.
  void WriteCollector(const std::string& repository, const std::string& collector,
                      int32_t number, const std::string& definition = "") {
    RecordWriter r;
    r.Int(1).Text("a").Date(2024, 1, 2).Date(2024, 1, 3).Text("b").Text("c").Int(number);
    r.Text(definition).Int(5).Int(0).Int(0).Int(0).Text("s1").Text("s2");
    test::WriteFile(Folder("Repositories") + repository + "_" + collector + ".col", r.Block());
  }

  void SetUp() override {
    test::LookupFixture::SetUp();
    std::filesystem::create_directories(Folder("Repositories"));
    std::filesystem::create_directories(Folder("Definitions"));
  }
};

TEST_F(RepositoryTest, MembersOpenTheirCollectorsFindexesInMemberOrder) {
  Build("_R_LIB_4", "varchar(20)", {"1, 'river'", "2, 'lake'"});
  Build("_R_LIB_9", "varchar(20)", {"3, 'river'", "7, 'sea'"});
  Build("_R_LIB_12", "varchar(20)", {"5, 'river'", "2, 'river'"});
  WriteRepository("LIB", {"c1", "c2", "c3"});
  WriteCollector("LIB", "C1", 4);
  WriteCollector("LIB", "C2", 9);
  WriteCollector("LIB", "C3", 12);

  CGiRepository view(defs_);
  view.OpenRepository("Lib");
  ASSERT_EQ(view.GetFindexCount(), 3);
  std::vector<std::string> names;
  for (int32_t i = 0; i < 3; ++i) names.push_back(view.GetFindex(i).Name());
  EXPECT_EQ(names, (std::vector<std::string>{"_R_LIB_4", "_R_LIB_9", "_R_LIB_12"}));
  EXPECT_EQ(view.GetFindexType(), 2);
  EXPECT_THROW(view.GetFindex(3), CGiRepositoryException);
  EXPECT_THROW(view.GetFindex(-1), CGiRepositoryException);
  // What a search over the members finds is SearchEvaluationTest's
  // RepositoriesSearchEveryMemberFindexAsOne.

  struct NameCase {
    std::string name;
    std::vector<std::string> findexes;
  };
  const std::vector<NameCase> names_cases = {
      {"Lib.C2", {"_R_LIB_9"}},
      {"Lib.X7", {"_R_LIB_X7"}},  // no collector file: the member as written
      {"Plain", {"Plain"}},       // no repository: a findex
  };
  for (const NameCase& c : names_cases) {
    EXPECT_EQ(CGiRepository::ResolveNames(defs_, c.name), c.findexes) << c.name;
  }
  view.OpenRepository("Lib.C3");
  ASSERT_EQ(view.GetFindexCount(), 1);
  EXPECT_EQ(view.GetFindex(0).Name(), "_R_LIB_12");
}

TEST_F(RepositoryTest, NamesThatAreNotPlainOrResolveToNothingAreRefused) {
  WriteRepository("EMPTY", {});
  WriteRepository("LIAR", {"c1"}, 100000);  // more members than the record holds
  struct RefusalCase {
    std::string name;
    std::string message;
  };
  const std::vector<RefusalCase> cases = {
      {"../Groups", "Invalid findex name"},
      {"Lib./x", "Invalid findex name"},
      {"Lib.", "Invalid collector name"},
      {".x", "Invalid repository name"},
      {"Empty", "Repository Empty has no members"},
      {"Liar", "ReadRepository"},
      {"NoSuchFindex", "NOSUCHFINDEX.sdx"},
  };
  for (const RefusalCase& c : cases) {
    CGiRepository view(defs_);
    try {
      view.OpenRepository(c.name);
      ADD_FAILURE() << c.name << " opened";
    } catch (const CException& e) {
      EXPECT_NE(e.GetFullTextUtf8(kLevelGeneral).find(c.message), std::string::npos)
          << c.name << ": " << e.GetFullTextUtf8(kLevelGeneral);
    }
    EXPECT_FALSE(view.IsOpen());
    EXPECT_THROW(view.GetSeparators(), CGiRepositoryException);
    EXPECT_THROW(view.GetFindexType(), CGiRepositoryException);
  }
}

TEST_F(RepositoryTest, CollectorSectionsAndDefinitionsReadBackAsWritten) {
  RecordWriter d;
  d.Int(3).Text("def").Date(2023, 5, 6).Text("t1").Text("t2").Text("t3").Text("t4");
  for (int i = 1; i <= 7; ++i) d.Int(i);
  d.Int(2).Text("title").Int(1).Int(2).Int(3).Text("body").Int(4).Int(5).Int(6);
  test::WriteFile(Folder("Definitions") + "DOCS.def", d.Block());

  // Kind 2: groups, entries, the kinds 2-5 texts and the kind 2 list.
  RecordWriter c;
  c.Int(1).Text("a").Date(2024, 1, 2).Date(2024, 1, 3).Text("b").Text("c").Int(42);
  c.Text("Docs").Int(2).Int(0);
  c.Int(1).Text("g").Int(1).Text("k").Text("v");
  c.Int(1).Text("e1").Text("e2").Text("e3");
  c.Text("p").Text("q");
  c.Int(1).Text("u").Int(1).Int(2).Int(3).Int(4).Text("w");
  test::WriteFile(Folder("Repositories") + "WEB_SITE.col", c.Block());

  const CCollectorRecord record = CShareCollector(defs_).Read("Web", "Site");
  EXPECT_EQ(record.CollectorNumber, 42);
  EXPECT_EQ(record.CollectorKind, 2);
  EXPECT_EQ(record.Groups.at("g").at("k"), "v");
  EXPECT_EQ(record.Entries.at("e1"), (std::pair<std::string, std::string>{"e2", "e3"}));
  EXPECT_EQ(record.SectionTexts, (std::vector<std::string>{"p", "q", "u", "w"}));
  EXPECT_EQ(record.SectionIntegers, (std::vector<int32_t>{1, 2, 3, 4}));
  ASSERT_EQ(record.Definition.Columns.size(), 2u);
  EXPECT_EQ(record.Definition.Columns[1].Name, "body");
  EXPECT_EQ(record.Definition.Columns[1].Values[2], 6);
  EXPECT_EQ(record.Definition.Integers[6], 7);

  // A kind 1 record cut before its sections end fails in the reading.
  RecordWriter cut;
  cut.Int(1).Text("a").Date(2024, 1, 2).Date(2024, 1, 3).Text("b").Text("c").Int(1);
  cut.Text("").Int(1).Int(0).Int(0).Int(0).Text("only one of three texts");
  test::WriteFile(Folder("Repositories") + "WEB_CUT.col", cut.Block());
  try {
    CShareCollector(defs_).Read("Web", "Cut");
    ADD_FAILURE() << "a cut record was read";
  } catch (const CShareCollectorException& e) {
    EXPECT_NE(e.GetFullTextUtf8(kLevelGeneral).find("ReadCollector"), std::string::npos);
  }
  EXPECT_THROW(CShareCollector(defs_).Read("Web", "Missing"), CShareCollectorException);
}

}  // namespace
}  // namespace qm
