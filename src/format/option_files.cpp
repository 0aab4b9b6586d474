#include "format/option_files.h"

#include <functional>
#include <string>

#include "base/cwstr.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "format/mfile.h"
#include "config/temp_names.h"
#include "base/trace.h"
#include "config/win_file.h"

namespace qm {

namespace {

constexpr std::string_view kTraceTag = "PILIB.PiStartPoint.OptionFiles";

std::string ConfigFolder(const CGlobalDefs& defs) {
  return defs.GetFullDataPath(FolderKind::GroupConfig);
}

// Runs read over the file; true when it read the whole file and nothing is
// left over. A missing file is simply false; any other failure is traced.
bool ReadOptionFile(const std::string& path, const std::function<void(MFile&)>& read) {
  if (!platform::FileExists(path)) return false;
  try {
    MFile file;
    file.OpenFile(path, MFile::kReadOnly);
    read(file);
    if (!file.IsEOF()) {
      Trace(true, kTraceTag, "Option file has more bytes than its values, ignored: %s", path);
      return false;
    }
    return true;
  } catch (const CExceptionBase& e) {
    Trace(true, kTraceTag, "Option file could not be read, ignored: %s: %S", path,
          e.GetFullText(200));
    return false;
  }
}

std::u16string ReadString(MFile& file) {
  CWStr text;
  file.ReadStr(text);
  return std::u16string(text.View());
}

void WriteString(MFile& file, const std::u16string& text) { file.WriteStr(CWStr(text)); }

// Writes a temporary file in the folder and renames it onto name.
void ReplaceOptionFile(const CGlobalDefs& defs, const char* name,
                       const std::function<void(MFile&)>& write) {
  const std::string folder = ConfigFolder(defs);
  const std::string temporary = folder + SLGetTempFileName(defs, true, kTempCallerOptionFiles) + ".tmp";
  try {
    MFile file;
    file.OpenFile(temporary, MFile::kCreate);
    write(file);
    file.MCommit();
    file.Close();
    WinFile::RemoveFile(temporary, folder + name);
  } catch (...) {
    try {
      DropFile(temporary);
    } catch (...) {
      // The first failure is the one to report.
    }
    throw;
  }
}

}  // namespace

void LoadIndexOptionFiles(const CGlobalDefs& defs, IndexOptions& options) {
  const std::string folder = ConfigFolder(defs);
  int32_t a = 0, b = 0, c = 0;
  std::u16string text;
  if (ReadOptionFile(folder + kIndexLanguageOptionFile, [&](MFile& f) {
        a = f.ReadInt();
        b = f.ReadInt();
      })) {
    options.LanguageFlags = a;
    options.Language = b;
  }
  if (ReadOptionFile(folder + kIndexGeneralOptionFile, [&](MFile& f) {
        a = f.ReadInt();
        b = f.ReadInt();
        c = f.ReadInt();
        text = ReadString(f);
      })) {
    options.GeneralFlags = a;
    options.IndexMaxSize = b;
    options.IndexStartValue = c;
    options.Separators = text;
  }
  if (ReadOptionFile(folder + kIndexUpdateOptionFile, [&](MFile& f) {
        a = f.ReadInt();
        b = f.ReadInt();
      })) {
    options.UpdateFlags = a;
    options.UpdateSupport = b;
  }
}

void LoadOrderOptionFiles(const CGlobalDefs& defs, OrderOptions& options) {
  const std::string folder = ConfigFolder(defs);
  int32_t a = 0, b = 0;
  std::u16string text;
  if (ReadOptionFile(folder + kOrderGeneralOptionFile, [&](MFile& f) {
        a = f.ReadInt();
        text = ReadString(f);
      })) {
    options.GeneralFlags = a;
    options.IgnoreChars = text;
  }
  if (ReadOptionFile(folder + kOrderUpdateOptionFile, [&](MFile& f) {
        a = f.ReadInt();
        b = f.ReadInt();
      })) {
    options.UpdateFlags = a;
    options.UpdateSupport = b;
  }
}

void SaveIndexOptionFiles(const CGlobalDefs& defs, const IndexOptions& options) {
  ReplaceOptionFile(defs, kIndexLanguageOptionFile, [&](MFile& f) {
    f.WriteInt(options.LanguageFlags);
    f.WriteInt(options.Language);
  });
  ReplaceOptionFile(defs, kIndexGeneralOptionFile, [&](MFile& f) {
    f.WriteInt(options.GeneralFlags);
    f.WriteInt(options.IndexMaxSize);
    f.WriteInt(options.IndexStartValue);
    WriteString(f, options.Separators);
  });
  ReplaceOptionFile(defs, kIndexUpdateOptionFile, [&](MFile& f) {
    f.WriteInt(options.UpdateFlags);
    f.WriteInt(options.UpdateSupport);
  });
}

void SaveOrderOptionFiles(const CGlobalDefs& defs, const OrderOptions& options) {
  ReplaceOptionFile(defs, kOrderGeneralOptionFile, [&](MFile& f) {
    f.WriteInt(options.GeneralFlags);
    WriteString(f, options.IgnoreChars);
  });
  ReplaceOptionFile(defs, kOrderUpdateOptionFile, [&](MFile& f) {
    f.WriteInt(options.UpdateFlags);
    f.WriteInt(options.UpdateSupport);
  });
}

}  // namespace qm
