// A host that ends without AppExit, with an idle thread or (given any argument) with a request that never returns. It
// must end soon, and with its own exit code.

#include <atomic>
#include <chrono>
#include <TAVO/maintenance.h>
#include <thread>

namespace {

std::atomic<bool> g_started{false};

struct Endless final : TAVO::Maintenance::IMaintenanceRequest {
    const wchar_t* GetName() override { return L"endless"; }
    unsigned long long GetDueTime() override { return 0; }
    std::int32_t GetPriority() override { return 0; }
    void Run() override {
        for (g_started = true;;) std::this_thread::sleep_for(std::chrono::seconds(1));
    }
};

} // namespace

int main(int argc, char**) {
    if (!TAVO::AppInit()) return 1;
    if (argc < 2) return 0;
    if (!TAVO::Maintenance::RegisterRequest(TAVO::Maintenance::CPRequest<Endless>())) return 2;
    while (!g_started) std::this_thread::yield();
    return 0;
}
