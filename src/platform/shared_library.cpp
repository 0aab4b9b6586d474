#include "platform/shared_library.h"

#include <dlfcn.h>

namespace qm::platform {

SharedLibrary& SharedLibrary::operator=(SharedLibrary&& other) noexcept {
  if (this != &other) {
    if (handle_ != nullptr) dlclose(handle_);
    handle_ = other.handle_;
    other.handle_ = nullptr;
  }
  return *this;
}

SharedLibrary::~SharedLibrary() {
  if (handle_ != nullptr) dlclose(handle_);
}

SharedLibrary SharedLibrary::Load(const std::string& path, std::string& error) {
  SharedLibrary library;
  // RTLD_LOCAL: two plugins may export the same entry-point names.
  library.handle_ = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  if (library.handle_ == nullptr) {
    const char* why = dlerror();
    error = why != nullptr ? why : "unknown loader error";
  }
  return library;
}

void* SharedLibrary::Symbol(const char* name) const {
  if (handle_ == nullptr) return nullptr;
  return dlsym(handle_, name);
}

}  // namespace qm::platform
