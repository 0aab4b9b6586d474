#include "sources/share_collector.h"

#include "base/exception_family.h"
#include "base/plain_name.h"
#include "base/trace.h"
#include "config/global_defs.h"
#include "platform/file_io.h"
#include "platform/text_encoding.h"
#include "sources/record_block.h"

namespace qm {

namespace {

void ReadTexts(CBlock& block, CCollectorRecord& record, int n) {
  for (int i = 0; i < n; ++i) record.SectionTexts.push_back(ReadRecordText(block));
}

}  // namespace

std::string CShareCollector::PathOf(std::string_view repository, std::string_view collector) const {
  return defs_.GetFullDataPath(FolderKind::Repositories) + ToUpper(repository) + "_" +
         ToUpper(collector) + ".col";
}

bool CShareCollector::Exists(std::string_view repository, std::string_view collector) const {
  return IsPlainName(repository) && IsPlainName(collector) &&
         platform::FileExists(PathOf(repository, collector));
}

CCollectorRecord CShareCollector::Read(std::string_view repository,
                                      std::string_view collector) const {
  return Guard<CShareCollectorException, CShareCollectorUnknownException>("ReadCollector", [&] {
    Trace(defs_.TraceLevel1(), "PILIB,FILIB,GILIB,REPLIB.(SHARELIB) ShareCollector.ReadCollector",
          "Reading Collector");
    RequirePlainName<CShareCollectorException>("repository", repository, "ReadCollector");
    RequirePlainName<CShareCollectorException>("collector", collector, "ReadCollector");
    CBlock block(kRecordBlockUnits);
    ReadRecordBlock<CShareCollectorException>(PathOf(repository, collector), block,
                                              "OpenCollector");
    CCollectorRecord record;
    record.Field1 = block.ReadInt();
    record.Field2 = ReadRecordText(block);
    record.Field3 = block.ReadDate();
    record.Field4 = block.ReadDate();
    record.Field5 = ReadRecordText(block);
    record.Field6 = ReadRecordText(block);
    record.CollectorNumber = block.ReadInt();
    record.DefinitionName = ReadRecordText(block);
    record.CollectorKind = block.ReadInt();
    record.Field10 = block.ReadInt();
    const int32_t groups = block.ReadInt();
    for (int32_t g = 0; g < groups; ++g) {
      std::string key = ReadRecordText(block);
      auto& pairs = record.Groups[key];
      const int32_t n = block.ReadInt();
      for (int32_t i = 0; i < n; ++i) {
        std::string first = ReadRecordText(block);
        pairs[first] = ReadRecordText(block);
      }
    }
    const int32_t entries = block.ReadInt();
    for (int32_t e = 0; e < entries; ++e) {
      std::string first = ReadRecordText(block);
      std::string second = ReadRecordText(block);
      record.Entries[first] = {std::move(second), ReadRecordText(block)};
    }
    const int32_t kind = record.CollectorKind;
    if (kind == 1) ReadTexts(block, record, 3);
    if (kind == 1 || kind == 7) {
      record.SectionIntegers.push_back(block.ReadInt());
      record.SectionIntegers.push_back(block.ReadInt());
      ReadTexts(block, record, 1);
      record.SectionIntegers.push_back(block.ReadInt());
      record.SectionIntegers.push_back(block.ReadInt());
      ReadTexts(block, record, 1);
      record.SectionDates.push_back(block.ReadDate());
      record.SectionIntegers.push_back(block.ReadInt());
    }
    if (kind >= 2 && kind <= 5) ReadTexts(block, record, 2);
    if (kind == 2) {
      const int32_t d = block.ReadInt();
      for (int32_t i = 0; i < d; ++i) {
        ReadTexts(block, record, 1);
        for (int j = 0; j < 4; ++j) record.SectionIntegers.push_back(block.ReadInt());
        ReadTexts(block, record, 1);
      }
    }
    if (kind == 3 || kind == 4) {
      const int32_t e = block.ReadInt();
      for (int32_t i = 0; i < e; ++i) {
        ReadTexts(block, record, 2);
        record.SectionIntegers.push_back(block.ReadInt());
      }
    }
    if (kind == 7) ReadTexts(block, record, 2);
    if (!record.DefinitionName.empty()) {
      record.Definition = CShareDefinition(defs_).Read(record.DefinitionName);
    }
    return record;
  });
}

}  // namespace qm
