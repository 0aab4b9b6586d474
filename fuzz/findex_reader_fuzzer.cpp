// A sound findex, damaged by the input, then looked up in every way: each
// lookup answers with whole rows from within the item file or raises an error
// of the family; nothing crashes, hangs or allocates past what the files hold.
//
// Input: byte 0 cuts a file when non-zero (bit 0 picks it, the value its new
// length as a share of 255); then groups of 5 bytes, each (file, offset in
// three bytes, new byte) overwriting one byte of the tree or item file.
#include <unistd.h>

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "fuzz_check.h"
#include "base/exception.h"
#include "config/global_defs.h"
#include "format/bfile.h"
#include "format/column_set.h"
#include "format/findex_postings.h"
#include "format/findex_tree.h"
#include "format/index_header.h"
#include "format/items.h"
#include "search/gi_findex.h"
#include "search/item_runs.h"
#include "search/word_search.h"

using qm::fuzz::Require;

namespace {

struct Sound {
  ~Sound() {
    std::error_code ignored;
    std::filesystem::remove_all(root, ignored);
  }
  std::string root;
  std::string folder;
  std::string sdx;
  std::string fst;
  std::string sdx_bytes;
  std::string fst_bytes;
  qm::CGlobalDefs defs;
};

std::string Slurp(const std::string& path) {
  std::ifstream in(path, std::ios::binary);
  return std::string(std::istreambuf_iterator<char>(in), {});
}

void Spill(const std::string& path, const std::string& bytes) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

// Words W0000 .. W1199, each with a few postings (key, position).
Sound& MakeSound() {
  static Sound sound;
  static const bool made = [] {
    Sound& s = sound;
    const std::string root =
        (std::filesystem::temp_directory_path() / ("qm_findex_fuzz_" + std::to_string(getpid())))
            .string() + "/";
    s.root = root;
    s.folder = root + "Groups/PUBLIC/Indexes/";
    std::filesystem::create_directories(s.folder);
    s.defs.SetDataPath(root);
    s.sdx = s.folder + "FUZZ.sdx";
    s.fst = s.folder + "FUZZ.fst";
    const qm::CColumnSet columns = qm::CColumnSet::FromGeneralFlags(2);
    qm::BFile tree;
    tree.OpenFile(s.sdx, qm::BFile::kCreate, qm::CFindexTreeWriter::kBlockUnits);
    qm::CFindexTreeWriter writer(tree, qm::CFindexTreeWriter::kMaxBlockNumber);
    qm::CFindexPostingWriter postings(columns, qm::CFindexPostingWriter::kMaxFileBytes);
    postings.Create(s.fst);
    for (int w = 0; w < 1200; ++w) {
      std::string text = std::to_string(w);
      text = "W" + std::string(4 - text.size(), '0') + text;
      qm::CValue value;
      value.SetText(text);
      writer.AddWord(value, postings.BeginList());
      for (int32_t k = 1; k <= 1 + w % 4; ++k) {
        const int32_t row[2] = {k * 7 + w, w % 13};
        postings.AddEntry(row);
      }
      postings.EndList();
    }
    qm::CIndexHeader header;
    header.BlockNum = writer.Finish();
    header.FindexType = 2;
    header.GeneralFlags = 2;
    header.BuildState = 1;
    header.IndexName = "FUZZ";
    header.WriteInfo(tree);
    tree.Close();
    postings.Close();
    s.sdx_bytes = Slurp(s.sdx);
    s.fst_bytes = Slurp(s.fst);
    return true;
  }();
  Require(made);
  return sound;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, std::size_t size) {
  Sound& sound = MakeSound();
  std::string sdx = sound.sdx_bytes;
  std::string fst = sound.fst_bytes;
  if (size > 0 && data[0] != 0) {
    std::string& cut = (data[0] & 1) != 0 ? fst : sdx;
    cut.resize(cut.size() * data[0] / 255);
  }
  for (std::size_t at = 1; at + 5 <= size; at += 5) {
    std::string& target = (data[at] & 1) != 0 ? fst : sdx;
    if (target.empty()) continue;
    const std::size_t offset =
        (static_cast<std::size_t>(data[at + 1]) | (static_cast<std::size_t>(data[at + 2]) << 8) |
         (static_cast<std::size_t>(data[at + 3]) << 16)) % target.size();
    target[offset] = static_cast<char>(data[at + 4]);
  }
  Spill(sound.sdx, sdx);
  Spill(sound.fst, fst);

  using namespace qm::compare_flags;
  struct Probe {
    const char16_t* word;
    int32_t flags;
    int64_t limit;
  };
  static const Probe kProbes[] = {
      {u"W0600", 0, 0},        {u"W0600", kGreater, 0}, {u"W0600", kLess | kEqual, 0},
      {u"W01*", 0, 0},         {u"*9", 0, 64},          {u"W0012", kSimilarDistance, 0},
      {u"W9999", 0, 0},
  };
  qm::CGiFIndex findex(sound.defs);
  try {
    findex.Open("FUZZ");
  } catch (const qm::CExceptionBase&) {
    return 0;
  }
  const int64_t row_size = findex.RowSize();
  for (const Probe& probe : kProbes) {
    qm::CItems items(qm::CColumnSet::FromGeneralFlags(findex.Header().GeneralFlags));
    try {
      findex.GetItems(items, qm::CWordSearch::ForText(probe.word, 2), probe.flags, -1,
                      probe.limit, false);
    } catch (const qm::CExceptionBase&) {
      continue;
    }
    // Rows come from disjoint ranges of the item file, under the limit.
    Require(static_cast<int64_t>(items.Count()) * row_size <= findex.ItemFileSize());
    Require(probe.limit == 0 || items.Count() * row_size <= probe.limit);
    try {
      qm::MergeRuns(items);
    } catch (const qm::CExceptionBase&) {
      continue;
    }
  }
  return 0;
}
