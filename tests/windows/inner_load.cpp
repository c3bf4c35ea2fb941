// The test program that holds the library's objects has no entry point of a library: this does the load step for it.
#include "lifecycle.h"

namespace {

__attribute__((constructor(101))) void Load() { TAVO::OnLoad(); }

} // namespace
