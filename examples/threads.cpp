// A worker: a thread that waits for work or for the order to stop, and tells when it has done its part.

#include <cstdio>
#include <TAVO/threading.h>

using namespace TAVO::Threading;

namespace {

const CPEvent g_stop(true);  // stays set: everybody shall see it
const CPEvent g_work(false); // one signal, one part of the work
const CPEvent g_done(false);

struct Worker {
    static constexpr _acfUID uid = {0x6F1D2A40, 0x0B8E, 0x4C57, {0x9A, 0x11, 0x5D, 0x37, 0xC2, 0x80, 0x4E, 0x63}};

    int parts = 0;

    void Run(unsigned long long most) {
        CPMultipleEvent orders;
        orders.Attach(g_stop); // the lowest index wins
        orders.Attach(g_work);
        while (orders.Wait(WaitForever) != 0 && parts < static_cast<int>(most)) {
            ++parts;
            g_done.Set();
        }
    }
};

} // namespace

int main() {
    const TAVO::Buffers::CPObjectMemory object = CThreadWrapper<Worker>::Create();
    CPThread thread;
    if (!thread.Execute(object, 1000)) return 1;
    for (int part = 0; part < 10; ++part) {
        g_work.Set();
        if (g_done.Wait(10000) != 0) return 1;
    }
    g_stop.Set();
    if (thread.Wait(WaitForever) != 0) return 1;

    // A thread without such an order ends at its next wait or sleep when it is terminated.
    CThreadWrapper<Worker>& worker = *CThreadWrapper<Worker>::From(object);
    g_stop.Reset();
    if (!thread.Execute(object, 1000)) return 1;
    const bool ended = thread.Terminate();

    std::printf("%d parts, then %s\n", worker.Object().parts, ended ? "terminated" : "left to itself");
    return worker.Object().parts == 10 && ended && worker.GetState() == ThreadFailed ? 0 : 1;
}
