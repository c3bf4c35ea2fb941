// The load step: a constructor ahead of all others of the library. It cannot refuse the load, so AppInit tells the
// failure.

#include "lifecycle.h"

namespace {

__attribute__((constructor(101))) void Load() { TAVO::OnLoad(); }

} // namespace
