// A shared library loaded at run time (dlopen), unloaded when the object dies.
#pragma once

#include <string>

namespace qm::platform {

class SharedLibrary {
 public:
  SharedLibrary() = default;
  SharedLibrary(SharedLibrary&& other) noexcept : handle_(other.handle_) { other.handle_ = nullptr; }
  SharedLibrary& operator=(SharedLibrary&& other) noexcept;
  SharedLibrary(const SharedLibrary&) = delete;
  SharedLibrary& operator=(const SharedLibrary&) = delete;
  ~SharedLibrary();

  // Loads the library with its symbols kept private to it; on failure the
  // result is not loaded and error holds the loader's explanation.
  static SharedLibrary Load(const std::string& path, std::string& error);

  bool IsLoaded() const { return handle_ != nullptr; }
  // The address of an exported symbol, or nullptr.
  void* Symbol(const char* name) const;

 private:
  void* handle_ = nullptr;
};

}  // namespace qm::platform
