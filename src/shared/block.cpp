#include "shared/block.h"

#include <new>
#include <string>

#include "shared/byte_layout.h"
#include "shared/exception_family.h"
#include "shared/trace.h"

namespace qm {

CBlock::CBlock(int32_t units) {
  const int64_t size = static_cast<int64_t>(units) * kUnitBytes;
  auto failure = [size] {
    return CBlockException::Text("Could not allocate memory size: %i", "Blobk", nullptr, size + 4);
  };
  if (units < 1 || units > kMaxUnits) throw failure();
  try {
    buffer_.assign(static_cast<std::size_t>(size + kHeaderBytes), 0);
  } catch (const std::bad_alloc&) {
    throw failure();
  }
  size_ = static_cast<int32_t>(size);
  open_ = true;
  used_ = cursor_ = kHeaderBytes;
  bytes::StoreI32(buffer_.data(), kHeaderBytes);
}

void CBlock::Release() {
  std::vector<uint8_t>().swap(buffer_);
  open_ = false;
}

void CBlock::RequireOpen(const char* method) const {
  if (open_) return;
  Trace(true, std::string("SHARELIB_ERROR.Block.") + method, "Block not open");
  throw CBlockException::General(method);
}

void CBlock::Reset() {
  RequireOpen("Reset");
  bytes::StoreU16(buffer_.data(), kHeaderBytes);
  bytes::StoreU16(buffer_.data() + 2, 0);
  bytes::StoreU16(buffer_.data() + 4, 0);
  used_ = cursor_ = kHeaderBytes;
  link1_ = link2_ = 0;
}

void CBlock::SetPosition(int32_t i) {
  RequireOpen("SetPosition");
  cursor_ = i < 0 ? 0 : kHeaderBytes + 4 * i;
}

void CBlock::LoadHeader() {
  RequireOpen("LoadHeader");
  used_ = bytes::LoadU16(buffer_.data());
  link1_ = bytes::LoadU16(buffer_.data() + 2);
  link2_ = bytes::LoadU16(buffer_.data() + 4);
  cursor_ = kHeaderBytes;
}

void CBlock::StoreUsed() {
  RequireOpen("StoreUsed");
  bytes::StoreI32(buffer_.data(), used_);
}

}  // namespace qm
