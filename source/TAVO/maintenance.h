#pragma once
// The maintenance thread from inside: what starts and stops it.

#include <cstdint>

namespace TAVO::Maintenance {

// Builds what the thread and its list need; called when the library is loaded. Until then nothing can be registered.
void Load() noexcept;
// Ends a forgotten thread, waiting `milliseconds` at most, and lets the list go. False when the thread goes on: then
// nothing of the library may be taken down, since it uses it.
bool Unload(std::uint32_t milliseconds) noexcept;

// Starts the thread, unless there is one. The caller holds g_lifecycleMutex.
bool Start() noexcept;
// Asks the thread to stop and waits for it without limit. The caller holds g_lifecycleMutex and is not the thread.
void Stop() noexcept;

// Whether the caller is the maintenance thread, which must not wait for its own end.
bool IsOwnThread() noexcept;
// Lets the thread end after the run it is in. The next Start or Stop waits for that.
void AskToStop() noexcept;
// Whether the thread was asked to stop and nobody has waited for it yet.
bool IsStopPending() noexcept;

} // namespace TAVO::Maintenance
