// The record files of repositories, collectors and definitions: block 0 of a
// file of 4,096-byte blocks, its fields in the block's item encoding. Reading
// past the block's used bytes raises the block's read errors, so no count in
// a record can make a reader run on or size an allocation.
#pragma once

#include <string>

#include "base/value.h"
#include "format/bfile.h"
#include "format/block.h"
#include "platform/file_io.h"

namespace qm {

inline constexpr int32_t kRecordBlockUnits = 64;

// Reads block 0 of path into block; a file that cannot be opened or read
// raises Exception's general error naming open_method.
template <class Exception>
void ReadRecordBlock(const std::string& path, CBlock& block, const char* open_method) {
  BFile file;
  try {
    file.OpenFile(path, BFile::kReadOnly, kRecordBlockUnits);
    file.SeekToBlock(0);
    file.ReadBlock(block);
  } catch (const CException& e) {
    throw Exception::General(open_method, &e);
  }
}

inline std::string ReadRecordText(CBlock& block) {
  std::string text;
  block.ReadStr(text);
  return text;
}

}  // namespace qm
