// The findex tests' own view of findex files: values and entries as the tests
// make them, the sorted entry file written byte by byte, what a findex should
// hold, and a decoder of .sdx/.fst pairs written from the documented layout
// alone (it shares no code with the writer).
#pragma once

#include <compare>
#include <cstdint>
#include <map>
#include <optional>
#include <ostream>
#include <string>
#include <variant>
#include <vector>

namespace qm::test {

struct Date16 {
  int16_t year = 0;
  uint16_t month = 0, day = 0, hour = 0, minute = 0, second = 0;
  uint32_t fraction = 0;
  auto operator<=>(const Date16&) const = default;
};

// One value of each findex type: Integer (1), AsciiString (2), DateTime (3),
// UnicodeString (4), Double (6), in this order of alternatives.
using WordValue = std::variant<int32_t, std::string, Date16, std::u16string, double>;
int32_t TypeCode(const WordValue& value);
// A value as text: text as UTF-8, numbers by std::to_string, dates "Y-M-D h:m:s".
std::string WordText(const WordValue& value);

struct Entry {
  WordValue value;
  int32_t key = 0;
  int32_t weight = 1;
  int32_t position = 0;
};

using Posting = std::vector<int32_t>;  // key, [weight], [position]

// A little-endian 32-bit integer at at.
int32_t LoadInt32(const std::string& in, std::size_t at);
// The value of the type code (1, 2, 3, 4, 6) at pos, moving pos past it;
// nullopt, pos unmoved, when it would pass limit.
std::optional<WordValue> DecodeValue(const std::string& in, std::size_t& pos, std::size_t limit,
                                     int32_t type);

struct Word {
  WordValue value;
  std::vector<Posting> postings;
  bool operator==(const Word&) const = default;
};
// For test failure output.
void PrintTo(const Word& word, std::ostream* out);

// Writes entries (already in value, then key order) as a sorted entry file
// for a findex with the given general flags (1 scores, 2 positions).
void WriteSortedFile(const std::string& path, const std::vector<Entry>& entries, int32_t flags);

// What the entries must give: one word per distinct value; without
// positions, consecutive entries of one key are one posting with the weights
// added (saturating).
std::vector<Word> ExpectedWords(const std::vector<Entry>& entries, int32_t flags);

struct DecodedNode {
  std::vector<int32_t> children;
  std::vector<WordValue> separators;
};

struct DecodedFindex {
  int32_t block_num = 0;        // from the header
  int32_t findex_type = 0;      // from the header
  std::vector<Word> words;      // in tree order
  std::vector<int32_t> leaves;  // non-empty leaves in tree order
  std::vector<int32_t> nodes_per_level{0, 0, 0};
  std::map<int32_t, DecodedNode> nodes;
  // Every rule of the layout that the files break, in words.
  std::vector<std::string> faults;
};

// Decodes a findex of the given type and general flags: the header fields it
// needs, the four-level tree from block 1 (each separator the highest value
// below it, so a search descends to the right leaf), the leaf chain and every
// posting list, checking the layout on the way.
DecodedFindex DecodeFindex(const std::string& sdx_path, const std::string& fst_path, int32_t type,
                           int32_t flags);

}  // namespace qm::test
