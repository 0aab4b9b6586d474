// Repository, collector and definition records written byte by byte, as
// the tests lay them out without the engine's writer.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace qm::test {

// One record: block 0 of a 4,096-byte block file. Used count first (32-bit),
// then the fields: ints 4 bytes, texts a 16-bit length and the bytes, dates
// 16 bytes, all little-endian.
class RecordWriter {
 public:
  RecordWriter& Int(int32_t v) {
    const auto u = static_cast<uint32_t>(v);
    for (int i = 0; i < 4; ++i) bytes_.push_back(static_cast<char>((u >> (8 * i)) & 0xFF));
    return *this;
  }
  RecordWriter& Short(uint16_t v) {
    bytes_.push_back(static_cast<char>(v & 0xFF));
    bytes_.push_back(static_cast<char>(v >> 8));
    return *this;
  }
  RecordWriter& Text(const std::string& text) {
    Short(static_cast<uint16_t>(text.size()));
    bytes_ += text;
    return *this;
  }
  RecordWriter& Date(int16_t year, uint16_t month, uint16_t day) {
    Short(static_cast<uint16_t>(year)).Short(month).Short(day).Short(0).Short(0).Short(0);
    return Int(0);
  }
  std::string Block() const {
    std::string block(4096, '\0');
    const auto used = static_cast<uint32_t>(bytes_.size());
    for (std::size_t i = 0; i < 4; ++i) block[i] = static_cast<char>((used >> (8 * i)) & 0xFF);
    block.replace(6, bytes_.size() - 6, bytes_.substr(6));
    return block;
  }

 private:
  std::string bytes_ = std::string(6, '\0');
};

}  // namespace qm::test
