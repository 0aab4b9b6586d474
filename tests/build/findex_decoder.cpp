#include "findex_decoder.h"

#include <algorithm>
#include <bit>
#include <limits>
#include <optional>

#include "support/test_support.h"

namespace qm::test {

namespace {

constexpr std::size_t kBlock = 4096;

void PutLe(std::string& out, uint64_t v, int n) {
  for (int i = 0; i < n; ++i) out.push_back(static_cast<char>((v >> (8 * i)) & 0xFF));
}

uint64_t GetLe(const std::string& in, std::size_t at, int n) {
  uint64_t v = 0;
  for (int i = n - 1; i >= 0; --i) v = (v << 8) | static_cast<uint8_t>(in[at + i]);
  return v;
}

void Encode(std::string& out, const WordValue& value) {
  switch (value.index()) {
    case 0: PutLe(out, static_cast<uint32_t>(std::get<0>(value)), 4); break;
    case 1: {
      const auto& s = std::get<1>(value);
      PutLe(out, s.size(), 2);
      out += s;
      break;
    }
    case 2: {
      const Date16& d = std::get<2>(value);
      PutLe(out, static_cast<uint16_t>(d.year), 2);
      for (uint16_t part : {d.month, d.day, d.hour, d.minute, d.second}) PutLe(out, part, 2);
      PutLe(out, d.fraction, 4);
      break;
    }
    case 3: {
      const auto& w = std::get<3>(value);
      PutLe(out, w.size(), 2);
      for (char16_t c : w) PutLe(out, c, 2);
      break;
    }
    case 4: PutLe(out, std::bit_cast<uint64_t>(std::get<4>(value)), 8); break;
  }
}

// Reads a value of the type at pos, not past limit; nullopt when it overruns.
std::optional<WordValue> Decode(const std::string& in, std::size_t& pos, std::size_t limit,
                                int32_t type) {
  auto fits = [&](std::size_t n) { return pos + n <= limit; };
  switch (type) {
    case 1:
      if (!fits(4)) return std::nullopt;
      pos += 4;
      return WordValue(static_cast<int32_t>(GetLe(in, pos - 4, 4)));
    case 2: {
      if (!fits(2)) return std::nullopt;
      const std::size_t n = GetLe(in, pos, 2);
      if (!fits(2 + n)) return std::nullopt;
      pos += 2 + n;
      return WordValue(in.substr(pos - n, n));
    }
    case 3: {
      if (!fits(16)) return std::nullopt;
      Date16 d;
      d.year = static_cast<int16_t>(GetLe(in, pos, 2));
      uint16_t* parts[] = {&d.month, &d.day, &d.hour, &d.minute, &d.second};
      for (int i = 0; i < 5; ++i) *parts[i] = static_cast<uint16_t>(GetLe(in, pos + 2 + 2 * i, 2));
      d.fraction = static_cast<uint32_t>(GetLe(in, pos + 12, 4));
      pos += 16;
      return WordValue(d);
    }
    case 4: {
      if (!fits(2)) return std::nullopt;
      const std::size_t n = GetLe(in, pos, 2);
      if (!fits(2 + 2 * n)) return std::nullopt;
      std::u16string w;
      for (std::size_t i = 0; i < n; ++i) w.push_back(static_cast<char16_t>(GetLe(in, pos + 2 + 2 * i, 2)));
      pos += 2 + 2 * n;
      return WordValue(w);
    }
    case 6:
      if (!fits(8)) return std::nullopt;
      pos += 8;
      return WordValue(std::bit_cast<double>(GetLe(in, pos - 8, 8)));
  }
  return std::nullopt;
}

int32_t Width(int32_t flags) { return 1 + (flags & 1) + ((flags & 2) >> 1); }

class Decoder {
 public:
  Decoder(std::string sdx, std::string fst, int32_t type, int32_t flags, DecodedFindex& out)
      : sdx_(std::move(sdx)), fst_(std::move(fst)), type_(type), width_(Width(flags)), out_(out) {}

  void Run() {
    if (sdx_.size() < kBlock) return Fault("no header block");
    out_.block_num = static_cast<int32_t>(GetLe(sdx_, 10, 4));
    if (GetLe(sdx_, 14, 4) != 614 || sdx_.substr(18, 6) != std::string("\x04\x00" "6.14", 6)) {
      Fault("header version");
    }
    if (GetLe(sdx_, 24, 4) != 1) Fault("build state is not 1");
    out_.findex_type = static_cast<int32_t>(GetLe(sdx_, 28, 4));
    if (sdx_.size() != static_cast<std::size_t>(out_.block_num) * kBlock) Fault("file size is not BlockNum blocks");
    if (out_.block_num < 2) {
      if (!fst_.empty()) Fault("postings without words");
      return;
    }
    visits_.assign(static_cast<std::size_t>(out_.block_num), 0);
    Walk(1, 0);
    for (int32_t b = 1; b < out_.block_num; ++b) {
      const int expected = b == end_leaf_ ? 3 : 1;
      if (visits_[b] != expected) Fault("block " + std::to_string(b) + " reached " + std::to_string(visits_[b]) + " times");
    }
    CheckChain();
    ReadPostings();
  }

 private:
  void Fault(const std::string& text) { out_.faults.push_back(text); }
  std::size_t At(int32_t block) const { return static_cast<std::size_t>(block) * kBlock; }
  std::size_t Used(int32_t block) const { return GetLe(sdx_, At(block), 2); }
  int32_t Link(int32_t block, int offset) const { return static_cast<int32_t>(GetLe(sdx_, At(block) + offset, 2)); }

  // Walks the subtree of block at level (0 root .. 3 leaf); returns its highest value.
  std::optional<WordValue> Walk(int32_t block, int level) {
    if (block < 1 || block >= out_.block_num) {
      Fault("child " + std::to_string(block) + " outside the file");
      return std::nullopt;
    }
    ++visits_[block];
    const std::size_t used = Used(block);
    if (used < 6 || used > kBlock) {
      Fault("used count of block " + std::to_string(block));
      return std::nullopt;
    }
    const std::size_t limit = At(block) + used;
    std::size_t pos = At(block) + 6;
    if (used == 6) {
      if (end_leaf_ != 0 && end_leaf_ != block) Fault("more than one empty block");
      end_leaf_ = block;
      return std::nullopt;
    }
    if (level == 3) return ReadLeaf(block, pos, limit);
    ++out_.nodes_per_level[level];
    DecodedNode node;
    while (pos < limit) {
      if (pos + 4 > limit) return Fault("node " + std::to_string(block) + " cut"), std::nullopt;
      node.children.push_back(static_cast<int32_t>(GetLe(sdx_, pos, 4)));
      pos += 4;
      if (pos == limit) break;
      auto separator = Decode(sdx_, pos, limit, type_);
      if (!separator) return Fault("separator of node " + std::to_string(block) + " cut"), std::nullopt;
      node.separators.push_back(*separator);
    }
    std::optional<WordValue> highest;
    for (std::size_t i = 0; i < node.children.size(); ++i) {
      auto child_highest = Walk(node.children[i], level + 1);
      if (i < node.separators.size()) {
        if (child_highest != node.separators[i]) Fault("separator of node " + std::to_string(block) + " is not the highest value of its child");
        highest = node.separators[i];
      } else if (node.children[i] != end_leaf_) {
        Fault("node " + std::to_string(block) + " has a last child that is not the empty leaf");
      }
    }
    if (node.children.size() != node.separators.size() && node.children.size() != node.separators.size() + 1) {
      Fault("node " + std::to_string(block) + " children and separators do not pair");
    }
    out_.nodes[block] = std::move(node);
    return highest;
  }

  std::optional<WordValue> ReadLeaf(int32_t block, std::size_t pos, std::size_t limit) {
    out_.leaves.push_back(block);
    auto& values = out_.leaf_values[block];
    while (pos < limit) {
      auto value = Decode(sdx_, pos, limit, type_);
      if (!value || pos + 4 > limit) return Fault("leaf " + std::to_string(block) + " cut"), std::nullopt;
      if (!out_.words.empty() && !(out_.words.back().value < *value)) Fault("values out of order in leaf " + std::to_string(block));
      positions_.push_back(static_cast<int32_t>(GetLe(sdx_, pos, 4)));
      pos += 4;
      out_.words.push_back(Word{*value, {}});
      values.push_back(*value);
    }
    return values.back();
  }

  void CheckChain() {
    const auto& leaves = out_.leaves;
    for (std::size_t i = 0; i < leaves.size(); ++i) {
      const int32_t next = i + 1 < leaves.size() ? leaves[i + 1] : 0;
      const int32_t previous = i > 0 ? leaves[i - 1] : 0;
      if (Link(leaves[i], 2) != next || Link(leaves[i], 4) != previous) {
        Fault("leaf chain broken at block " + std::to_string(leaves[i]));
      }
    }
    if (end_leaf_ != 0 && (Link(end_leaf_, 2) != 0 || Link(end_leaf_, 4) != 0)) Fault("empty leaf linked");
  }

  void ReadPostings() {
    const std::size_t row_bytes = 4 * static_cast<std::size_t>(width_);
    std::size_t cursor = 0;
    for (std::size_t w = 0; w < out_.words.size(); ++w) {
      const auto position = static_cast<std::size_t>(static_cast<uint32_t>(positions_[w]));
      if (position != cursor) return Fault("posting lists are not back to back at word " + std::to_string(w));
      if (position + row_bytes > fst_.size()) return Fault("count row past the file");
      const auto count = static_cast<int32_t>(GetLe(fst_, position, 4));
      for (int32_t c = 1; c < width_; ++c) {
        if (GetLe(fst_, position + 4 * c, 4) != 0) Fault("count row column not 0");
      }
      if (count < 2) return Fault("list without postings");
      cursor = position + row_bytes * static_cast<std::size_t>(count);
      if (cursor > fst_.size()) return Fault("list past the file");
      for (int32_t r = 1; r < count; ++r) {
        Posting posting;
        for (int32_t c = 0; c < width_; ++c) {
          posting.push_back(static_cast<int32_t>(GetLe(fst_, position + row_bytes * r + 4 * c, 4)));
        }
        out_.words[w].postings.push_back(std::move(posting));
      }
    }
    if (cursor != fst_.size()) Fault("bytes after the last list");
  }

  std::string sdx_;
  std::string fst_;
  int32_t type_;
  int32_t width_;
  DecodedFindex& out_;
  std::vector<int> visits_;
  std::vector<int32_t> positions_;
  int32_t end_leaf_ = 0;
};

}  // namespace

void PrintTo(const Word& word, std::ostream* out) {
  switch (word.value.index()) {
    case 0: *out << std::get<0>(word.value); break;
    case 1: *out << '"' << std::get<1>(word.value) << '"'; break;
    case 2: *out << "date " << std::get<2>(word.value).year << "-" << std::get<2>(word.value).month; break;
    case 3: *out << "wide of " << std::get<3>(word.value).size(); break;
    case 4: *out << std::get<4>(word.value); break;
  }
  *out << ":";
  for (const Posting& p : word.postings) {
    *out << " (";
    for (const int32_t& v : p) *out << v << (&v == &p.back() ? "" : ",");
    *out << ")";
  }
}

int32_t TypeCode(const WordValue& value) {
  constexpr int32_t kCodes[] = {1, 2, 3, 4, 6};
  return kCodes[value.index()];
}

void WriteSortedFile(const std::string& path, const std::vector<Entry>& entries, int32_t flags) {
  std::string out;
  for (const Entry& e : entries) {
    PutLe(out, static_cast<uint32_t>(e.key), 4);
    if (flags & 1) PutLe(out, static_cast<uint32_t>(e.weight), 4);
    if (flags & 2) PutLe(out, static_cast<uint32_t>(e.position), 4);
    Encode(out, e.value);
  }
  WriteFile(path, out);
}

std::vector<Word> ExpectedWords(const std::vector<Entry>& entries, int32_t flags) {
  std::vector<Word> words;
  for (const Entry& e : entries) {
    if (words.empty() || words.back().value != e.value) words.push_back(Word{e.value, {}});
    auto& postings = words.back().postings;
    if (!(flags & 2) && !postings.empty() && postings.back()[0] == e.key) {
      if (flags & 1) {
        const int64_t sum = static_cast<int64_t>(postings.back()[1]) + e.weight;
        postings.back()[1] = static_cast<int32_t>(std::clamp<int64_t>(
            sum, std::numeric_limits<int32_t>::min(), std::numeric_limits<int32_t>::max()));
      }
      continue;
    }
    Posting p{e.key};
    if (flags & 1) p.push_back(e.weight);
    if (flags & 2) p.push_back(e.position);
    postings.push_back(std::move(p));
  }
  return words;
}

DecodedFindex DecodeFindex(const std::string& sdx_path, const std::string& fst_path, int32_t type,
                           int32_t flags) {
  DecodedFindex out;
  Decoder(ReadFile(sdx_path), ReadFile(fst_path), type, flags, out).Run();
  return out;
}

int32_t DescendTo(const DecodedFindex& findex, const WordValue& value) {
  int32_t block = 1;
  for (int level = 0; level < 3; ++level) {
    const auto it = findex.nodes.find(block);
    if (it == findex.nodes.end()) return block;  // the empty end leaf
    const DecodedNode& node = it->second;
    std::size_t i = 0;
    while (i < node.separators.size() && node.separators[i] < value) ++i;
    block = node.children[std::min(i, node.children.size() - 1)];
  }
  return block;
}

}  // namespace qm::test
