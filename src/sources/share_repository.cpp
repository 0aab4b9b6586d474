#include "sources/share_repository.h"

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "config/global_defs.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "sources/record_block.h"

namespace qm {

std::string CShareRepository::PathOf(std::string_view name) const {
  return defs_.GetFullDataPath(FolderKind::Repositories) + ToUpper(name) + ".rep";
}

bool CShareRepository::Exists(std::string_view name) const {
  return IsPlainName(name) && platform::FileExists(PathOf(name));
}

CRepositoryRecord CShareRepository::Read(std::string_view name) const {
  return Guard<CShareRepositoryException, CShareRepositoryUnknownException>(
      "ReadRepository", [&] {
        RequirePlainName<CShareRepositoryException>("repository", name, "ReadRepository");
        CBlock block(kRecordBlockUnits);
        ReadRecordBlock<CShareRepositoryException>(PathOf(name), block, "OpenRepository");
        CRepositoryRecord record;
        record.Field1 = block.ReadInt();
        record.Field2 = ReadRecordText(block);
        record.Field3 = block.ReadDate();
        record.Field4 = ReadRecordText(block);
        record.DefinitionName = ReadRecordText(block);
        record.Field6 = block.ReadDate();
        record.Field7 = block.ReadInt();
        const int32_t members = block.ReadInt();
        for (int32_t i = 0; i < members; ++i) {
          std::string collector = ReadRecordText(block);
          const int32_t value = block.ReadInt();
          record.Members.emplace_back(std::move(collector), value);
        }
        if (!record.DefinitionName.empty()) {
          record.Definition = CShareDefinition(defs_).Read(record.DefinitionName);
        }
        return record;
      });
}

}  // namespace qm
