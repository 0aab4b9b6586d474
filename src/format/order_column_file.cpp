#include "format/order_column_file.h"

#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "format/mfile.h"

namespace qm {

namespace {

// Bytes of a value that has no length field.
std::size_t FixedValueBytes(VALUE_TYPE type) {
  switch (type) {
    case VALUE_TYPE::Double: return 8;
    case VALUE_TYPE::DateTime: return bytes::kDateBytes;
    default: return 4;
  }
}

}  // namespace

OrderColumnReader::OrderColumnReader(MFile& file, VALUE_TYPE type)
    : file_(file), type_(type), remaining_(file.FileSize(false)) {
  file_.Seek(0);
}

void OrderColumnReader::Damaged() const {
  throw CPiOrderSortException::Text("Order column file is damaged: %s", "ReadColumnFile", nullptr,
                                    file_.Path());
}

bool OrderColumnReader::Next(std::vector<uint8_t>& value, std::vector<int32_t>& keys) {
  if (remaining_ == 0) return false;
  auto take = [&](uint8_t* out, std::size_t n) {
    if (static_cast<int64_t>(n) > remaining_) Damaged();
    file_.ReadData(out, n);
    remaining_ -= static_cast<int64_t>(n);
  };
  value.clear();
  if (type_ == VALUE_TYPE::AsciiString || type_ == VALUE_TYPE::UnicodeString) {
    uint8_t length[2];
    take(length, 2);
    if ((length[1] & 0x80) != 0) Damaged();
    const std::size_t units = bytes::LoadU16(length);
    const std::size_t n = units * (type_ == VALUE_TYPE::UnicodeString ? 2 : 1);
    value.resize(2 + n);
    value[0] = length[0];
    value[1] = length[1];
    if (n > 0) take(value.data() + 2, n);
  } else {
    value.resize(FixedValueBytes(type_));
    take(value.data(), value.size());
  }
  uint8_t count_bytes[4];
  take(count_bytes, 4);
  const int32_t count = bytes::LoadI32(count_bytes);
  if (count < 0 || int64_t{count} * 4 > remaining_) Damaged();
  buffer_.resize(static_cast<std::size_t>(count) * 4);
  if (count > 0) take(buffer_.data(), buffer_.size());
  keys.resize(static_cast<std::size_t>(count));
  for (std::size_t i = 0; i < keys.size(); ++i) {
    keys[i] = bytes::LoadI32(buffer_.data() + 4 * i);
    if (i > 0 && keys[i] <= keys[i - 1]) Damaged();
  }
  return true;
}

void OrderColumnWriter::Write(std::span<const uint8_t> value, std::span<const int32_t> keys) {
  buffer_.resize(4 + 4 * keys.size());
  bytes::StoreI32(buffer_.data(), static_cast<int32_t>(keys.size()));
  for (std::size_t i = 0; i < keys.size(); ++i)
    bytes::StoreI32(buffer_.data() + 4 + 4 * i, keys[i]);
  file_.WriteData(value.data(), value.size());
  file_.WriteData(buffer_.data(), buffer_.size());
  ++entries_;
}

}  // namespace qm
