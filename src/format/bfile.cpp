#include "format/bfile.h"

#include "format/block.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"

namespace qm {

namespace {

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CBFileException>(method, std::forward<Body>(body));
}

}  // namespace

void BFile::OpenFile(const std::string& path, int32_t mode, int32_t block_units) {
  Guarded("OpenFile", [&] {
    if (mode != kCreate && mode != kCreateToo && mode != kReadOnly) {
      throw CBFileException::Text("Unknown index mode", "OpenFile", nullptr);
    }
    if (block_units < 1 || block_units > CBlock::kMaxUnits) throw CBFileException::General("OpenFile");
    Close();
    if (mode == kReadOnly) {
      file_.OpenWinFile(path, platform::FileAccess::Read, platform::kFileAttributeSequentialScan,
                        platform::FileDisposition::OpenExisting);
    } else {
      file_.CreateWinFile(path, platform::FileAccess::ReadWrite,
                          platform::kFileAttributeHidden | platform::kFileAttributeSequentialScan);
    }
    block_size_ = block_units * CBlock::kUnitBytes;
    path_ = path;
    open_ = true;
  });
}

void BFile::Close() {
  file_.Close();
  open_ = false;
}

int64_t BFile::BlockCount() const {
  return Guarded("BlockCount", [&] {
    if (!open_) throw CBFileException::General("BlockCount");
    return file_.Size() / block_size_;
  });
}

void BFile::CheckSize(const CBlock& block, const char* method) const {
  block.RequireOpen(method);
  if (block.Size() != block_size_) {
    // Text kept as written: callers match on it. Do not correct.
    throw CBFileException::Text("Block size missmatch", method, nullptr);
  }
}

void BFile::ReadBlock(CBlock& block) {
  Guarded("ReadBlock", [&] {
    CheckSize(block, "ReadBlock");
    const int64_t number = file_.Position() / block_size_;
    const auto size = static_cast<std::size_t>(block_size_);
    const std::size_t got = file_.Read(block.Data(), size);
    if (got != size) {
      block.SetUsed(CBlock::kHeaderBytes);  // the old contents are partly overwritten
      block.SetCursor(CBlock::kHeaderBytes);
      throw CBFileException::Text("Error reading block %i of %s: %i of %i bytes read", "ReadBlock",
                                  nullptr, number, path_, got, size);
    }
    block.LoadHeader();
    block.SetOrigin(number, path_);
    // A used count outside the block can only come from a damaged file.
    if (block.GetUsed() < CBlock::kHeaderBytes || block.GetUsed() > block_size_) {
      const int32_t used = block.GetUsed();
      block.SetUsed(CBlock::kHeaderBytes);  // nothing of it can be trusted
      throw CBFileException::Text("Damaged block %i of %s: used count %i", "ReadBlock", nullptr,
                                  number, path_, used);
    }
  });
}

void BFile::WriteBlock(CBlock& block) {
  Guarded("writeblock", [&] {
    CheckSize(block, "writeblock");
    block.StoreUsed();
    file_.Write(block.Data(), static_cast<std::size_t>(block_size_));
    block.SetCursor(CBlock::kHeaderBytes);
  });
}

void BFile::AddBlock(CBlock& block) {
  Guarded("addblock", [&] {
    CheckSize(block, "addblock");
    block.SetCursor(0);
    block.StoreUsed();
    file_.SeekToEnd();
    file_.Write(block.Data(), static_cast<std::size_t>(block_size_));
    block.SetCursor(CBlock::kHeaderBytes);
  });
}

void BFile::SeekToBlock(int32_t block_number) {
  Guarded("SeekToBlock", [&] {
    if (block_number < 0) throw CBFileException::General("SeekToBlock");
    file_.Seek(static_cast<int64_t>(block_number) * block_size_);
  });
}

void BFile::SetLinkWord(int32_t block_number, int32_t offset, uint16_t value, const char* method) {
  Guarded(method, [&] {
    if (block_number < 0) throw CBFileException::General(method);
    uint8_t word[2];
    bytes::StoreU16(word, value);
    file_.WriteAt(word, 2, static_cast<int64_t>(block_number) * block_size_ + offset);
  });
}

void BFile::SetLinkWord1(int32_t block_number, uint16_t value) {
  SetLinkWord(block_number, 2, value, "SetLinkWord1");
}

void BFile::SetLinkWord2(int32_t block_number, uint16_t value) {
  SetLinkWord(block_number, 4, value, "SetLinkWord2");
}

}  // namespace qm
