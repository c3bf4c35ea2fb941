// The string pool's maintenance request, and its start and stop.

#include "poolmaintenance.h"

#include "blocks.h"
#include "lifecycle.h"
#include "maintenance.h"

#include <mutex>
#include <TAVO/string.h>

namespace TAVO::String {

using Buffers::Block;
using Buffers::tagCPOMEMHEADER;

namespace {

// Milliseconds.
constexpr unsigned long long kPause = 10000;
constexpr unsigned long long kPauseAfterWholeRound = 20000;
constexpr ulong32 kSweepBudget = 10;

void Create(void* payload, std::size_t) { ::new (payload) CStringPoolMaintenance; }
void Finalize(void* payload, std::size_t) { static_cast<CStringPoolMaintenance*>(payload)->~CStringPoolMaintenance(); }
void* QueryInterface(void* payload, const _acfUID& type) {
    return static_cast<CStringPoolMaintenance*>(payload)->QueryInterface(type);
}
constexpr Buffers::tagCPOVTABL kTable = {Create, nullptr, Finalize, QueryInterface};

// The process's one request; a bare reference, so that no destructor touches it.
constinit tagCPOMEMHEADER* g_request = nullptr;

} // namespace

CStringPoolMaintenance::CStringPoolMaintenance() noexcept : m_lastRun(Core::OS::GetTimeNow()) {}

const wchar_t* CStringPoolMaintenance::GetName() { return L"CStringPoolMaintenance"; }

unsigned long long CStringPoolMaintenance::GetDueTime() {
    return m_lastRun + (m_lastResult ? kPauseAfterWholeRound : kPause);
}

void CStringPoolMaintenance::Run() {
    m_lastResult = CStringPool::Collect(kSweepBudget);
    m_lastRun = Core::OS::GetTimeNow();
}

std::int32_t CStringPoolMaintenance::GetPriority() { return m_lastResult ? -2 : 0; }

void* CStringPoolMaintenance::QueryInterface(const _acfUID& type) {
    const bool known = acfIsSame(type, acfTypeOf<Maintenance::IMaintenanceRequest>::uid);
    return known ? static_cast<Maintenance::IMaintenanceRequest*>(this) : nullptr;
}

namespace pool {

bool StartMaintenance() noexcept {
    if (g_request) return false;
    g_request = Block::NewBlock(sizeof(CStringPoolMaintenance), sizeof(CStringPoolMaintenance), &kTable);
    if (!g_request) return false;
    Create(g_request + 1, sizeof(CStringPoolMaintenance));
    const Buffers::CPObjectMemory request(Block::Adopt(Block::Acquire(g_request)));
    return Maintenance::RegisterRequest(request);
}

void StopMaintenance() noexcept {
    if (!g_request) return;
    const Buffers::CPObjectMemory request(Block::Adopt(Block::Acquire(g_request)));
    if (Maintenance::UnregisterRequest(request)) DropMaintenance();
}

void DropMaintenance() noexcept { Block::Free(std::exchange(g_request, nullptr)); }

} // namespace pool

// On the maintenance thread these would wait for a stop that waits for them.
bool CStringPool::AppInit() noexcept {
    if (Maintenance::IsOwnThread()) return false;
    const std::lock_guard lock(g_lifecycleMutex);
    return pool::StartMaintenance();
}

void CStringPool::AppExit() noexcept {
    if (Maintenance::IsOwnThread()) return;
    const std::lock_guard lock(g_lifecycleMutex);
    pool::StopMaintenance();
}

} // namespace TAVO::String
