// CGiRepository: the catalogue view of one name in a search statement: a
// findex, a repository (its member findexes, in member order) or one member
// written "repository.collector". The view holds at least one open findex and
// a kind 2 reader unit on each findex it opened until Close, so no build can
// swap their files meanwhile (add-on findexes are read under their owner's).
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "format/index_header.h"

namespace qm {

class CGiFIndex;
class CGlobalDefs;
class CLockManager;

class CGiRepository {
 public:
  explicit CGiRepository(const CGlobalDefs& defs);
  ~CGiRepository();
  CGiRepository(const CGiRepository&) = delete;
  CGiRepository& operator=(const CGiRepository&) = delete;

  // Resolves name and opens its findexes (closing what was open). Names are
  // plain names, checked before any file is opened; a repository without
  // members is refused naming it.
  void OpenRepository(std::string_view name);
  void Close();
  bool IsOpen() const { return open_; }

  int32_t GetFindexCount() const { return static_cast<int32_t>(findexes_.size()); }
  // The i-th open findex, 0-based; another index raises (method "GetFindex").
  CGiFIndex& GetFindex(int32_t i);
  // The first findex's separators (expanded, with the default set when its
  // general option bit 4 asks for it); " " when they come out empty.
  std::u16string GetSeparators() const;
  // The first findex's value type.
  int32_t GetFindexType() const;
  // The first findex's header, language and language options.
  const CIndexHeader& Header() const;
  int32_t Language() const { return language_; }
  int32_t LanguageOptions() const { return language_options_; }

  // The findex names a name resolves to, in opening order, without opening
  // anything (repository and collector records are read).
  static std::vector<std::string> ResolveNames(const CGlobalDefs& defs, std::string_view name);

 private:
  void OpenMember(const std::string& findex_name);

  const CGlobalDefs& defs_;
  int32_t language_ = 2;
  int32_t language_options_ = 20;
  std::vector<std::unique_ptr<CGiFIndex>> findexes_;
  std::vector<std::unique_ptr<CLockManager>> locks_;
  bool open_ = false;
};

}  // namespace qm
