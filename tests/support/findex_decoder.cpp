#include "support/findex_decoder.h"

#include <algorithm>
#include <bit>
#include <limits>

#include "platform/text_encoding.h"
#include "support/test_support.h"

namespace qm::test {

namespace {

constexpr std::size_t kBlock = 4096;

void Put(std::string& out, uint64_t v, int n) {
  for (int i = 0; i < n; ++i) out.push_back(static_cast<char>((v >> (8 * i)) & 0xFF));
}

uint64_t Get(const std::string& in, std::size_t at, int n) {
  uint64_t v = 0;
  for (int i = n - 1; i >= 0; --i) v = (v << 8) | static_cast<uint8_t>(in[at + i]);
  return v;
}

// The value encoding of the sorted entry file and of blocks (the same).
void Encode(std::string& out, const WordValue& value) {
  if (const auto* i = std::get_if<int32_t>(&value)) Put(out, static_cast<uint32_t>(*i), 4);
  if (const auto* d = std::get_if<double>(&value)) Put(out, std::bit_cast<uint64_t>(*d), 8);
  if (const auto* s = std::get_if<std::string>(&value)) {
    Put(out, s->size(), 2);
    out += *s;
  }
  if (const auto* w = std::get_if<std::u16string>(&value)) {
    Put(out, w->size(), 2);
    for (char16_t c : *w) Put(out, c, 2);
  }
  if (const auto* t = std::get_if<Date16>(&value)) {
    for (uint16_t part :
         {static_cast<uint16_t>(t->year), t->month, t->day, t->hour, t->minute, t->second}) {
      Put(out, part, 2);
    }
    Put(out, t->fraction, 4);
  }
}

class Decoder {
 public:
  Decoder(const std::string& sdx_path, const std::string& fst_path, int32_t type, int32_t flags,
          DecodedFindex& out)
      : sdx_(ReadFile(sdx_path)),
        fst_(ReadFile(fst_path)),
        type_(type),
        width_(1 + (flags & 1) + ((flags & 2) >> 1)),
        out_(out) {}

  void Run() {
    if (sdx_.size() < kBlock) return Fault("no header block");
    out_.block_num = LoadInt32(sdx_, 10);
    if (LoadInt32(sdx_, 14) != 614 || sdx_.substr(18, 6) != std::string("\x04\x00" "6.14", 6))
      Fault("version");
    if (LoadInt32(sdx_, 24) != 1) Fault("build state");
    out_.findex_type = LoadInt32(sdx_, 28);
    if (out_.block_num < 1 || sdx_.size() != static_cast<std::size_t>(out_.block_num) * kBlock)
      return Fault("size is not BlockNum blocks");
    if (out_.block_num < 2) {
      if (!fst_.empty()) Fault("postings without words");
      return;
    }
    visits_.assign(static_cast<std::size_t>(out_.block_num), 0);
    Walk(1, 0);
    // Each block once, but the end leaf: once from the last node of each level.
    for (int32_t b = 1; b < out_.block_num; ++b) {
      if (visits_[b] != (b == end_leaf_ ? 3 : 1))
        Fault("block " + std::to_string(b) + " reached " + std::to_string(visits_[b]) + "x");
    }
    const auto& leaves = out_.leaves;
    for (std::size_t i = 0; i < leaves.size(); ++i) {
      if (Link(leaves[i], 2) != (i + 1 < leaves.size() ? leaves[i + 1] : 0) ||
          Link(leaves[i], 4) != (i > 0 ? leaves[i - 1] : 0)) {
        Fault("leaf chain at " + std::to_string(leaves[i]));
      }
    }
    if (end_leaf_ != 0 && (Link(end_leaf_, 2) != 0 || Link(end_leaf_, 4) != 0))
      Fault("end leaf linked");
    ReadPostings();
  }

 private:
  void Fault(const std::string& text) { out_.faults.push_back(text); }
  std::size_t At(int32_t block) const { return static_cast<std::size_t>(block) * kBlock; }
  int32_t Link(int32_t block, int offset) const {
    return static_cast<int32_t>(Get(sdx_, At(block) + offset, 2));
  }

  // Walks the subtree of block at level (0 root, 3 leaf); returns its highest value.
  std::optional<WordValue> Walk(int32_t block, int level) {
    if (block < 1 || block >= out_.block_num) return Fault("child outside the file"), std::nullopt;
    ++visits_[block];
    const std::size_t used = Get(sdx_, At(block), 2);
    if (used < 6 || used > kBlock) return Fault("used count"), std::nullopt;
    const std::size_t limit = At(block) + used;
    std::size_t pos = At(block) + 6;
    if (used == 6) {
      if (end_leaf_ != 0 && end_leaf_ != block) Fault("two empty blocks");
      end_leaf_ = block;
      return std::nullopt;
    }
    const std::string where = " in block " + std::to_string(block);
    if (level == 3) {
      out_.leaves.push_back(block);
      while (pos < limit) {
        auto value = DecodeValue(sdx_, pos, limit, type_);
        if (!value || pos + 4 > limit) return Fault("leaf row cut" + where), std::nullopt;
        if (!out_.words.empty() && !(out_.words.back().value < *value)) Fault("order" + where);
        positions_.push_back(LoadInt32(sdx_, pos));
        pos += 4;
        out_.words.push_back(Word{*value, {}});
      }
      return out_.words.back().value;
    }
    ++out_.nodes_per_level[level];
    DecodedNode node;
    while (pos < limit) {
      if (pos + 4 > limit) return Fault("child cut" + where), std::nullopt;
      node.children.push_back(LoadInt32(sdx_, pos));
      pos += 4;
      if (pos == limit) break;
      auto separator = DecodeValue(sdx_, pos, limit, type_);
      if (!separator) return Fault("separator cut" + where), std::nullopt;
      node.separators.push_back(*separator);
    }
    std::optional<WordValue> highest;
    for (std::size_t i = 0; i < node.children.size(); ++i) {
      const auto child_highest = Walk(node.children[i], level + 1);
      if (i < node.separators.size()) {
        if (child_highest != node.separators[i]) Fault("separator not the child's highest" + where);
        highest = node.separators[i];
      } else if (node.children[i] != end_leaf_) {
        Fault("unpaired child not the end leaf" + where);
      }
    }
    out_.nodes[block] = std::move(node);
    return highest;
  }

  // The posting lists lie back to back in word order: a count row (count of
  // rows including itself, other columns 0), then the postings.
  void ReadPostings() {
    const std::size_t row = 4 * static_cast<std::size_t>(width_);
    std::size_t cursor = 0;
    for (std::size_t w = 0; w < out_.words.size(); ++w) {
      const auto position = static_cast<std::size_t>(static_cast<uint32_t>(positions_[w]));
      if (position != cursor) return Fault("lists not back to back at word " + std::to_string(w));
      if (position + row > fst_.size()) return Fault("count row past the end");
      const int32_t count = LoadInt32(fst_, position);
      for (int32_t c = 1; c < width_; ++c) {
        if (LoadInt32(fst_, position + 4 * c) != 0) Fault("count row column not 0");
      }
      cursor = position + row * static_cast<std::size_t>(std::max(count, 1));
      if (count < 2 || cursor > fst_.size()) return Fault("bad count " + std::to_string(count));
      for (int32_t r = 1; r < count; ++r) {
        Posting posting;
        for (int32_t c = 0; c < width_; ++c)
          posting.push_back(LoadInt32(fst_, position + row * r + 4 * c));
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

int32_t LoadInt32(const std::string& in, std::size_t at) {
  return static_cast<int32_t>(Get(in, at, 4));
}

std::optional<WordValue> DecodeValue(const std::string& in, std::size_t& pos, std::size_t limit,
                                     int32_t type) {
  if (type < 1 || type > 6 || type == 5) return std::nullopt;
  const std::size_t at = pos;
  const bool text = type == 2 || type == 4;
  if (text && at + 2 > limit) return std::nullopt;
  const std::size_t n = text ? Get(in, at, 2) : 0;
  const std::size_t size = type == 1 ? 4 : type == 6 ? 8 : type == 3 ? 16 : 2 + n * (type / 2);
  if (at + size > limit) return std::nullopt;
  pos += size;
  switch (type) {
    case 1: return WordValue(LoadInt32(in, at));
    case 6: return WordValue(std::bit_cast<double>(Get(in, at, 8)));
    case 2: return WordValue(in.substr(at + 2, n));
    case 4: {
      std::u16string w;
      for (std::size_t i = 0; i < n; ++i) w.push_back(static_cast<char16_t>(Get(in, at + 2 + 2 * i, 2)));
      return WordValue(w);
    }
  }
  auto part = [&](int i) { return static_cast<uint16_t>(Get(in, at + 2 * i, 2)); };
  return WordValue(Date16{static_cast<int16_t>(part(0)), part(1), part(2), part(3), part(4),
                          part(5), static_cast<uint32_t>(Get(in, at + 12, 4))});
}

void PrintTo(const Word& word, std::ostream* out) {
  if (const auto* s = std::get_if<std::string>(&word.value)) *out << '"' << *s << '"';
  *out << "(value " << word.value.index() << ") with " << word.postings.size() << " postings";
}

int32_t TypeCode(const WordValue& value) {
  constexpr int32_t kCodes[] = {1, 2, 3, 4, 6};
  return kCodes[value.index()];
}

std::string WordText(const WordValue& v) {
  if (const auto* s = std::get_if<std::string>(&v)) return *s;
  if (const auto* w = std::get_if<std::u16string>(&v)) return Utf16ToUtf8(*w);
  if (const auto* i = std::get_if<int32_t>(&v)) return std::to_string(*i);
  if (const auto* d = std::get_if<double>(&v)) return std::to_string(*d);
  const auto& t = std::get<Date16>(v);
  return std::to_string(t.year) + "-" + std::to_string(t.month) + "-" + std::to_string(t.day) +
         " " + std::to_string(t.hour) + ":" + std::to_string(t.minute) + ":" +
         std::to_string(t.second);
}

void WriteSortedFile(const std::string& path, const std::vector<Entry>& entries, int32_t flags) {
  std::string out;
  for (const Entry& e : entries) {
    Put(out, static_cast<uint32_t>(e.key), 4);
    if (flags & 1) Put(out, static_cast<uint32_t>(e.weight), 4);
    if (flags & 2) Put(out, static_cast<uint32_t>(e.position), 4);
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
  Decoder(sdx_path, fst_path, type, flags, out).Run();
  return out;
}

}  // namespace qm::test
