#include "config/temp_names.h"

#include <cerrno>
#include <optional>

#include "locks/lock_manager.h"
#include "base/byte_layout.h"
#include "base/exception_family.h"
#include "config/file_operations.h"
#include "config/global_defs.h"
#include "config/win_file.h"

namespace qm {

namespace {

constexpr int32_t kCounterLimit = 10000;
constexpr int kWorkFileAttempts = 9999;
constexpr std::size_t kMaxExtension = 16;

bool IsExtensionChar(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '_' ||
         c == '-';
}

}  // namespace

std::string SLGetTempFileName(const CGlobalDefs& defs, bool group_scope, int32_t caller) {
  constexpr const char* kMethod = "SLGetTempFileName";
  return Guard<CSTDFUNException>(kMethod, [&] {
    const std::string folder = group_scope ? defs.GetFullDataPath(FolderKind::GroupConfig)
                                           : defs.GetHomePathRequired(FolderKind::HomeConfig, kMethod);
    // The counter file's own folder scopes its lock.
    CLockManager lock(folder, group_scope ? defs.GetGroup() : std::string("home"), "generator",
                      kLockGenerator);
    int32_t counter = 1;
    std::optional<CWinFileException> write_failure;
    {
      ScopedWriterLock hold(lock);
      WinFile file;
      file.OpenWinFile(folder + "generator.dat", platform::FileAccess::ReadWrite);
      uint8_t word[4] = {};
      if (file.Read(word, 4) == 4) {
        const int64_t next = static_cast<int64_t>(bytes::LoadI32(word)) + 1;
        // A damaged counter restarts the cycle like an exhausted one.
        counter = next >= 1 && next <= kCounterLimit ? static_cast<int32_t>(next) : 1;
      }
      bytes::StoreI32(word, counter);
      try {
        file.Seek(0);
        file.Write(word, 4);
      } catch (const CWinFileException& e) {
        write_failure = e;
      }
    }
    if (write_failure) {
      throw CSTDFUNException::Text("Error writing to generator.dat", kMethod, &*write_failure);
    }
    return "tmpxxxx_" + std::to_string(caller) + "_" + std::to_string(counter);
  });
}

std::string TempWorkFileExtension(std::string_view source_name) {
  std::string_view name = source_name.substr(0, source_name.find_first_of("?#"));
  const auto slash = name.find_last_of("/\\");
  if (slash != std::string_view::npos) name = name.substr(slash + 1);
  const auto dot = name.rfind('.');
  if (dot == std::string_view::npos) return ".tmp";
  const std::string_view extension = name.substr(dot + 1);
  if (extension.empty() || extension.size() > kMaxExtension) return ".tmp";
  for (char c : extension) {
    if (!IsExtensionChar(c)) return ".tmp";
  }
  // Built in two steps: "." + string trips a false -Wrestrict of GCC 12 at -O2.
  std::string result(".");
  result += extension;
  return result;
}

std::string SLGetTempWorkFilePath(const CGlobalDefs& defs, int32_t caller,
                                  std::string_view source_name) {
  constexpr const char* kMethod = "SLGetTempWorkFilePath";
  return Guard<CSTDFUNException>(kMethod, [&] {
    const std::string folder = defs.GetFullDataPath(FolderKind::WorkData);
    const std::string extension = TempWorkFileExtension(source_name);
    for (int attempt = 0; attempt < kWorkFileAttempts; ++attempt) {
      const std::string path = folder + SLGetTempFileName(defs, true, caller) + extension;
      // Created exclusively: a name is taken by exactly one caller.
      platform::FileHandle file = platform::OpenFileAs(path, platform::FileAccess::Write,
                                                       platform::FileDisposition::CreateNew);
      if (file.IsOpen()) return path;
      if (errno != EEXIST) throw CSTDFUNException::Text(kOpenFailureText, kMethod, nullptr, path);
    }
    throw CSTDFUNException::Text("No available temp file. Please clear the work data folder.",
                                 kMethod, nullptr);
  });
}

std::string SLGetTempConfigFilePath(const CGlobalDefs& defs, int32_t caller) {
  constexpr const char* kMethod = "SLGetTempConfigFilePath";
  return Guard<CSTDFUNException>(kMethod, [&] {
    const std::string folder = defs.GetHomePathRequired(FolderKind::HomeConfig, kMethod);
    return folder + SLGetTempFileName(defs, false, caller) + ".tmp";
  });
}

}  // namespace qm
