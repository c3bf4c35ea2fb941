#pragma once
// What sweeps the string pool in the background: the pool's own maintenance request.

#include <TAVO/maintenance.h>

namespace TAVO::String {

// Paces CStringPool::Collect: every 10 seconds, every 20 and behind others while sweeps get through in time.
class CStringPoolMaintenance final : public Maintenance::IMaintenanceRequest {
public:
    CStringPoolMaintenance() noexcept;

    const wchar_t* GetName() override;
    unsigned long long GetDueTime() override;
    void Run() override;
    std::int32_t GetPriority() override;
    // This object as the interface of that type; null for every type but that of maintenance requests.
    virtual void* QueryInterface(const _acfUID& type);

private:
    unsigned long long m_lastRun; // as Core::OS::GetTimeNow
    bool m_lastResult = false;
};

namespace pool {

// Creates and registers the process's one request. False when there is one already. The caller holds g_lifecycleMutex.
bool StartMaintenance() noexcept;
// Unregisters and lets go of it; it stays where it is when unregistering fails. The caller holds g_lifecycleMutex.
void StopMaintenance() noexcept;
// Lets go of one that is still there, at unload.
void DropMaintenance() noexcept;

} // namespace pool
} // namespace TAVO::String
