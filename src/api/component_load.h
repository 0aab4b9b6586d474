// What the library does once, when the first API object of the process is
// created: fill the process-wide table of numbered error messages.
#pragma once

namespace qm {

void EnsureComponentLoaded();

}  // namespace qm
