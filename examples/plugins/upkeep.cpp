// A plug-in with work for the library's maintenance thread. The thread calls code of this module, so Unregister takes
// the request back first, and refuses to leave when that fails.

#include "clip_tool.h"

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <TAVO/maintenance.h>

using namespace TAVO;
using namespace TAVO::ACF;

namespace {

constexpr _acfUID kUpkeep = {0x0F54C32A, 0x88CE, 0x47A0, {0xB0, 0xD4, 0x52, 0x44, 0xA1, 0x1B, 0x6F, 0x0E}};

std::mutex g_mutex;
std::condition_variable g_ran;
int g_runs = 0;    // under the mutex
int g_objects = 0; // likewise

struct CUpkeep final : Maintenance::IMaintenanceRequest {
    const wchar_t* GetName() override { return L"upkeep"; }
    unsigned long long GetDueTime() override { return m_due; }
    void Run() override {
        m_due = Core::OS::GetTimeNow() + 1000;
        const std::lock_guard<std::mutex> lock(g_mutex);
        ++g_runs;
        g_ran.notify_all();
    }
    std::int32_t GetPriority() override { return 0; }

private:
    unsigned long long m_due = 0; // the maintenance thread's
};
Buffers::CPObjectMemory g_request;

// Reports the runs, after waiting for the first.
class CRuns final : public CComponent<CRuns, IClipTool> {
public:
    CRuns() { Count(1); }
    ~CRuns() { Count(-1); }
    acfResult ACF_CALL Run(const XML::CPXMLObject*, const String::CPPoolString*, XML::CPXMLObject* report) override {
        std::unique_lock<std::mutex> lock(g_mutex);
        if (!g_ran.wait_for(lock, std::chrono::seconds(30), [] { return g_runs > 0; })) return acfFail;
        return report->SetName(L"upkeep") && report->AddAttribute(L"ran", L"yes") ? acfOk : acfFail;
    }

private:
    static void Count(int step) {
        const std::lock_guard<std::mutex> lock(g_mutex);
        g_objects += step;
    }
};

} // namespace

extern "C" TAVO_EXPORT long32 TAVOPluginUnregister() {
    {
        const std::lock_guard<std::mutex> lock(g_mutex);
        if (g_objects != 0) return acfFail;
    }
    if (!Maintenance::UnregisterRequest(g_request)) return acfFail;
    g_request.free(); // its end is code of this module, too
    CPIACFUnknown::Factory_UnregisterClass(kUpkeep);
    return acfOk;
}

extern "C" TAVO_EXPORT long32 TAVOPluginRegister(IACFComponentFactory*) {
    g_request = Maintenance::CPRequest<CUpkeep>();
    const bool entered = Maintenance::RegisterRequest(g_request) &&
                         CPIACFUnknown::Factory_RegisterClass(kUpkeep, kClipTools, L"Upkeep",
                                                              [](const _acfUID&) { return CRuns::Make(); });
    if (entered) return acfOk;
    TAVOPluginUnregister();
    return acfFail;
}
