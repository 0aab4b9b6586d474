#include "api/component_load.h"

#include <mutex>

#include "base/error_messages.h"

namespace qm {

void EnsureComponentLoaded() {
  static std::once_flag once;
  std::call_once(once, [] { LoadErrorMessages(); });
}

}  // namespace qm
