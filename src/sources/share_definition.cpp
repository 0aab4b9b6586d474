#include "sources/share_definition.h"

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "config/global_defs.h"
#include "platform/text_encoding.h"
#include "sources/record_block.h"

namespace qm {

std::string CShareDefinition::PathOf(std::string_view name) const {
  return defs_.GetFullDataPath(FolderKind::Definitions) + ToUpper(name) + ".def";
}

CDefinitionRecord CShareDefinition::Read(std::string_view name) const {
  return Guard<CShareDefinitionException, CShareDefinitionUnknownException>(
      "ReadDefinition", [&] {
        RequirePlainName<CShareDefinitionException>("definition", name, "ReadDefinition");
        CBlock block(kRecordBlockUnits);
        ReadRecordBlock<CShareDefinitionException>(PathOf(name), block, "OpenDefinition");
        CDefinitionRecord record;
        record.Field1 = block.ReadInt();
        record.Field2 = ReadRecordText(block);
        record.Field3 = block.ReadDate();
        for (std::string& text : record.Texts) text = ReadRecordText(block);
        for (int32_t& value : record.Integers) value = block.ReadInt();
        const int32_t columns = block.ReadInt();
        for (int32_t i = 0; i < columns; ++i) {
          CDefinitionColumn column;
          column.Name = ReadRecordText(block);
          for (int32_t& value : column.Values) value = block.ReadInt();
          record.Columns.push_back(std::move(column));
        }
        return record;
      });
}

}  // namespace qm
