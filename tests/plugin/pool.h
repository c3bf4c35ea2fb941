#pragma once
// What the plug-in does with the pool, and what the loading tests let it do.

namespace plugin {

/// The entry that a static object holds while the plug-in is loaded; its destructor sets @p late to what it interned.
using HeldEntry = const wchar_t* (*)(const wchar_t** late);
constexpr const char* kHeldEntry = "TavoTestHeldEntry";
constexpr const wchar_t* kHeldText = L"Held by a plug-in's static object";
constexpr const wchar_t* kLateText = L"interned by a plug-in's static destructor";

enum Deed { Start, Use, RunAThread, KeepHandles, Fill, Sweep, Stop };

} // namespace plugin
