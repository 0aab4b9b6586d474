// Little-endian encoding of the engine's fixed-width items, in one place: the
// buffered file and the blocks both store integers, doubles and dates this way.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "base/value.h"

namespace qm::bytes {

inline constexpr std::size_t kDateBytes = 16;

inline void StoreU16(uint8_t* p, uint16_t v) {
  p[0] = static_cast<uint8_t>(v);
  p[1] = static_cast<uint8_t>(v >> 8);
}
inline void StoreU32(uint8_t* p, uint32_t v) {
  for (int i = 0; i < 4; ++i) p[i] = static_cast<uint8_t>(v >> (8 * i));
}
inline void StoreU64(uint8_t* p, uint64_t v) {
  for (int i = 0; i < 8; ++i) p[i] = static_cast<uint8_t>(v >> (8 * i));
}
inline uint16_t LoadU16(const uint8_t* p) {
  return static_cast<uint16_t>(p[0] | (p[1] << 8));
}
inline uint32_t LoadU32(const uint8_t* p) {
  uint32_t v = 0;
  for (int i = 3; i >= 0; --i) v = (v << 8) | p[i];
  return v;
}
inline uint64_t LoadU64(const uint8_t* p) {
  uint64_t v = 0;
  for (int i = 7; i >= 0; --i) v = (v << 8) | p[i];
  return v;
}

inline void StoreI16(uint8_t* p, int16_t v) { StoreU16(p, static_cast<uint16_t>(v)); }
inline void StoreI32(uint8_t* p, int32_t v) { StoreU32(p, static_cast<uint32_t>(v)); }
inline int16_t LoadI16(const uint8_t* p) { return static_cast<int16_t>(LoadU16(p)); }
inline int32_t LoadI32(const uint8_t* p) { return static_cast<int32_t>(LoadU32(p)); }

inline void StoreDouble(uint8_t* p, double v) { StoreU64(p, std::bit_cast<uint64_t>(v)); }
inline double LoadDouble(const uint8_t* p) { return std::bit_cast<double>(LoadU64(p)); }

// Date: year (signed 16), month, day, hour, minute, second (unsigned 16 each),
// fraction (unsigned 32).
inline void StoreDate(uint8_t* p, const DateTimeValue& d) {
  StoreI16(p, d.year);
  StoreU16(p + 2, d.month);
  StoreU16(p + 4, d.day);
  StoreU16(p + 6, d.hour);
  StoreU16(p + 8, d.minute);
  StoreU16(p + 10, d.second);
  StoreU32(p + 12, d.fraction);
}
inline DateTimeValue LoadDate(const uint8_t* p) {
  DateTimeValue d;
  d.year = LoadI16(p);
  d.month = LoadU16(p + 2);
  d.day = LoadU16(p + 4);
  d.hour = LoadU16(p + 6);
  d.minute = LoadU16(p + 8);
  d.second = LoadU16(p + 10);
  d.fraction = LoadU32(p + 12);
  return d;
}

}  // namespace qm::bytes
