#include "format/order_layout.h"

#include <bit>

namespace qm {

void EncodeOrderSlots(const CValue& value, std::span<int32_t> slots) {
  switch (value.GetType()) {
    case VALUE_TYPE::Double: {
      const auto bits = std::bit_cast<uint64_t>(value.GetDouble());
      slots[0] = static_cast<int32_t>(static_cast<uint32_t>(bits));
      slots[1] = static_cast<int32_t>(static_cast<uint32_t>(bits >> 32));
      return;
    }
    case VALUE_TYPE::DateTime:
      slots[0] = static_cast<int32_t>(value.DateKey());
      slots[1] = static_cast<int32_t>(value.TimeKey());
      return;
    default: slots[0] = value.GetInteger(); return;
  }
}

}  // namespace qm
