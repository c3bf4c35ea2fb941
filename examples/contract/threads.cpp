// Events, threads, and the thread that does the upkeep.

#include "contract.h"

#include <atomic>
#include <TAVO/core.h>
#include <TAVO/maintenance.h>
#include <TAVO/threading.h>

namespace contract {

using namespace TAVO;
using namespace TAVO::Threading;

namespace {

const CPEvent g_go(true), g_ended(true);

struct Worker {
    static constexpr _acfUID uid = {0xD0A3B7C1, 0x5E42, 0x4F19, {0x8C, 0x6B, 0x21, 0x94, 0xAF, 0x07, 0xE3, 0x5D}};
    void Run(unsigned long long) {
        g_go.Wait(WaitForever);
        g_ended.Set();
    }
};

// Leaves the list from outside of its run.
class Upkeep final : public Maintenance::IMaintenanceRequest {
public:
    explicit Upkeep(const CPEvent& ran) : m_ran(ran) {}
    const wchar_t* GetName() override { return L"contract"; }
    unsigned long long GetDueTime() override { return m_due; }
    std::int32_t GetPriority() override { return 0; }
    void Run() override {
        m_due = ~0ULL; // not again
        m_ran.Set();   // to unregister itself here would wait in vain for ten seconds
    }

private:
    CPEvent m_ran;
    std::atomic<unsigned long long> m_due{0};
};

} // namespace

void Threads() {
    const CPEvent low(true), high(true);
    const CPMultipleEvent both, none;
    const bool attached = both.Attach(low) && both.Attach(high);
    high.Set();
    low.Set();
    Is("of several events the one attached first wins", attached && both.Wait(0) == 0);
    Is("a multiple event without events does not wait", none.Wait(WaitForever) == WaitNoState);

    {
        CPThread thread;
        thread.Execute(CThreadWrapper<Worker>::Create(), 0);
    }
    g_go.Set();
    Is("a thread runs on without handles", g_ended.Wait(60000) == 0);
    CPThread waited;
    Instead("wait before the last one goes",
            waited.Execute(CThreadWrapper<Worker>::Create(), 0) && waited.Wait(60000) == 0);

    using namespace CurrentThread::OS;
    SetThreadPriority(ThreadPriorityTimeCritical);
    const eThreadPriority critical = GetThreadPriority();
    SetThreadPriority(ThreadPriorityNormal);
    Is("the five levels of priority read back as they were set", critical == ThreadPriorityTimeCritical);
}

void Maintenance() {
    const CPEvent ran(false);
    const Maintenance::CPRequest<Upkeep> request(ran);
    Is("unregistering what was never registered is true", Maintenance::UnregisterRequest(request));
    Is("registering works before the start", Maintenance::RegisterRequest(request));
    Is("and the request runs after it", AppInit() && ran.Wait(60000) == 0);
    Instead("unregister from another thread than its own", Maintenance::UnregisterRequest(request));
    AppExit();
}

} // namespace contract
