#include "search/gi_repository.h"

#include <new>

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "locks/lock_manager.h"
#include "platform/text_encoding.h"
#include "search/gi_findex.h"
#include "sources/share_collector.h"
#include "sources/share_repository.h"
#include "text/separators.h"

namespace qm {

namespace {

constexpr int32_t kAddDefaultSeparators = 4;

template <class Body>
decltype(auto) Guarded(const char* method, Body&& body) {
  return Guard<CGiRepositoryException, CGiRepositoryUnknownException>(method,
                                                                      std::forward<Body>(body));
}

std::string MemberFindexName(std::string_view repository, std::string_view member) {
  return "_R_" + ToUpper(repository) + "_" + std::string(member);
}

}  // namespace

CGiRepository::CGiRepository(const CGlobalDefs& defs) : defs_(defs) {}

CGiRepository::~CGiRepository() { Close(); }

std::vector<std::string> CGiRepository::ResolveNames(const CGlobalDefs& defs,
                                                     std::string_view name) {
  return Guarded("OpenRepository", [&] {
    RequirePlainName<CGiRepositoryException>("findex", name, "OpenRepository");
    std::vector<std::string> names;
    const std::size_t dot = name.find('.');
    if (dot == std::string_view::npos) {
      CShareRepository repositories(defs);
      if (!repositories.Exists(name)) {
        names.emplace_back(name);
        return names;
      }
      const CRepositoryRecord record = repositories.Read(name);
      if (record.Members.empty()) {
        throw CGiRepositoryException::Text("Repository %s has no members: there is no findex to search",
                                           "OpenRepository", nullptr, std::string(name));
      }
      CShareCollector collectors(defs);
      for (const auto& [collector, value] : record.Members) {
        const CCollectorRecord member = collectors.Read(name, collector);
        names.push_back(MemberFindexName(name, std::to_string(member.CollectorNumber)));
      }
      return names;
    }
    const std::string_view repository = name.substr(0, dot);
    const std::string_view collector = name.substr(dot + 1);
    RequirePlainName<CGiRepositoryException>("repository", repository, "OpenRepository");
    RequirePlainName<CGiRepositoryException>("collector", collector, "OpenRepository");
    CShareCollector collectors(defs);
    if (collectors.Exists(repository, collector)) {
      const CCollectorRecord member = collectors.Read(repository, collector);
      names.push_back(MemberFindexName(repository, std::to_string(member.CollectorNumber)));
    } else {
      names.push_back(MemberFindexName(repository, collector));
    }
    return names;
  });
}

void CGiRepository::OpenRepository(std::string_view name) {
  Guarded("OpenRepository", [&] {
    Close();
    try {
      for (const std::string& findex : ResolveNames(defs_, name)) OpenMember(findex);
    } catch (const std::bad_alloc&) {
      Close();
      // The findex array could not grow.
      throw CGiRepositoryException::Numbered(11, "OpenRepository", nullptr);
    } catch (...) {
      Close();
      throw;
    }
    const CIndexHeader& first = findexes_.front()->Header();
    language_ = first.Language;
    language_options_ = first.LanguageFlags;
    open_ = true;
  });
}

void CGiRepository::OpenMember(const std::string& findex_name) {
  // The name is checked before the lock and the files are named after it.
  RequirePlainName<CGiRepositoryException>("findex", findex_name, "OpenRepository");
  auto lock = std::make_unique<CLockManager>(defs_.GetLockScope(), defs_.GetGroup(), findex_name,
                                             kLockFindex);
  lock->LockReader();
  auto findex = std::make_unique<CGiFIndex>(defs_);
  findex->Open(findex_name);
  locks_.push_back(std::move(lock));
  findexes_.push_back(std::move(findex));
}

void CGiRepository::Close() {
  findexes_.clear();
  locks_.clear();  // releases the reader units
  language_ = 2;
  language_options_ = 20;
  open_ = false;
}

CGiFIndex& CGiRepository::GetFindex(int32_t i) {
  return Guarded("GetFindex", [&]() -> CGiFIndex& {
    if (i < 0 || i >= GetFindexCount()) {
      throw CGiRepositoryException::Text("No findex %i in this view of %i findexes", "GetFindex",
                                         nullptr, i, GetFindexCount());
    }
    return *findexes_[static_cast<std::size_t>(i)];
  });
}

const CIndexHeader& CGiRepository::Header() const {
  if (findexes_.empty()) {
    throw CGiRepositoryException::Text("No findex is open", "Header", nullptr);
  }
  return findexes_.front()->Header();
}

std::u16string CGiRepository::GetSeparators() const {
  return Guarded("GetSeparators", [&] {
    if (findexes_.empty()) {
      throw CGiRepositoryException::Text("No findex is open", "GetSeparators", nullptr);
    }
    const CIndexHeader& header = findexes_.front()->Header();
    std::u16string separators =
        BuildSeparators(header.Separators, (header.GeneralFlags & kAddDefaultSeparators) != 0);
    if (separators.empty()) separators.push_back(u' ');
    return separators;
  });
}

int32_t CGiRepository::GetFindexType() const {
  return Guarded("GetFindexType", [&] {
    if (findexes_.empty()) {
      throw CGiRepositoryException::Text("No findex is open", "GetFindexType", nullptr);
    }
    return findexes_.front()->FindexType();
  });
}

}  // namespace qm
