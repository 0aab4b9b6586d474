// CGiCmdList: the search commands of one result set, numbered from 1 in the
// order they were added, with the state the result set keeps across them.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

#include "format/index_header.h"
#include "search/cmd_tree.h"

namespace qm {

class CGiCmdList {
 public:
  // Appends a command and returns it; the list owns it.
  CGiCmdTree& Add(std::unique_ptr<CGiCmdTree> command) {
    if (commands_.size() == commands_.capacity()) commands_.reserve(commands_.size() + 10);
    commands_.push_back(std::move(command));
    return *commands_.back();
  }
  int32_t Count() const { return static_cast<int32_t>(commands_.size()); }
  // REQUIRES: 1 <= number <= Count().
  CGiCmdTree& Command(int32_t number) { return *commands_.at(static_cast<size_t>(number - 1)); }
  const CGiCmdTree& Command(int32_t number) const {
    return *commands_.at(static_cast<size_t>(number - 1));
  }
  void Clear() {
    commands_.clear();
    first_header.reset();
    score_active = false;
  }

  // The header of the first findex searched (key column, type, options).
  std::optional<CIndexHeader> first_header;
  bool score_active = false;
  int32_t score_group_count = 0;
  int32_t score_return_mode = 0;

 private:
  std::vector<std::unique_ptr<CGiCmdTree>> commands_;
};

}  // namespace qm
