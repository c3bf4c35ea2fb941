#pragma once
// What the loading tests let the plug-in do.

namespace plugin {

enum Deed { Start, Use, RunAThread, KeepHandles, Stop };

} // namespace plugin
