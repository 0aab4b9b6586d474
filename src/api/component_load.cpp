#include "api/component_load.h"

#include <mutex>

#include "shared/error_messages.h"

namespace qm {

void EnsureComponentLoaded() {
  static std::once_flag once;
  std::call_once(once, [] { LoadErrorMessages(); });
}

}  // namespace qm
