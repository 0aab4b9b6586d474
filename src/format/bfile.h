// BFile: a file of fixed-size blocks (block units x 64 bytes), read and
// written one CBlock at a time at the current position.
#pragma once

#include <cstdint>
#include <string>

#include "config/win_file.h"

namespace qm {

class CBlock;

class BFile {
 public:
  // 1 and 2: create or truncate, read and write; 3: open an existing file
  // for reading. Any other mode raises "Unknown index mode".
  enum Mode : int32_t { kCreate = 1, kCreateToo = 2, kReadOnly = 3 };

  BFile() = default;
  BFile(const BFile&) = delete;
  BFile& operator=(const BFile&) = delete;

  void OpenFile(const std::string& path, int32_t mode, int32_t block_units);
  void Close();
  bool IsOpen() const { return open_; }
  int32_t GetBlockSize() const { return block_size_; }
  const std::string& Path() const { return path_; }
  int64_t BlockCount() const;

  // Each raises "Block size missmatch" when the block's size is not the
  // file's. ReadBlock loads the block header and names the block as its
  // origin; a short read or a used count outside 6..block size raises a
  // message naming the block and leaves it empty. WriteBlock and AddBlock store
  // the used count first. The cursor ends at 6.
  void ReadBlock(CBlock& block);
  void WriteBlock(CBlock& block);
  void AddBlock(CBlock& block);  // at the end of the file
  void SeekToBlock(int32_t block_number);

  // Overwrite the 16-bit link word at byte 2 (1) or byte 4 (2) of a block in
  // place: the chain of leaf blocks.
  void SetLinkWord1(int32_t block_number, uint16_t value);
  void SetLinkWord2(int32_t block_number, uint16_t value);

 private:
  void CheckSize(const CBlock& block, const char* method) const;
  void SetLinkWord(int32_t block_number, int32_t offset, uint16_t value, const char* method);

  WinFile file_;
  int32_t block_size_ = 0;
  bool open_ = false;
  std::string path_;
};

}  // namespace qm
