// The library comes and goes with a plug-in: again and again, while its thread runs, under threads that have used it.

#include "loading.h"

#include "plugin/pool.h"
#include "support/gate.h"

#include <chrono>
#include <cstdlib>
#include <gtest/gtest.h>
#include <initializer_list>
#include <thread>

using namespace plugin;

namespace {

void* g_kept = nullptr; // a handle that outlives the library

// Loads the plug-in and lets it do all that; what is left to do before unloading goes on through Do.
struct Loaded {
    void* const plugin = loading::LoadPlugin();
    explicit Loaded(std::initializer_list<Deed> deeds) {
        for (const Deed deed : deeds) Do(deed);
    }
    ~Loaded() { loading::Unload(plugin); }
    void Do(Deed deed) const {
        reinterpret_cast<void (*)(Deed, void**)>(loading::Find(plugin, "TavoTestService"))(deed, &g_kept);
    }
};

} // namespace

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__) // their own records grow
constexpr std::size_t kMostGrowth = std::size_t{1} << 30;
#else
constexpr std::size_t kMostGrowth = 256 << 10;
#endif

TEST(Loading, CyclesDoNotGrowAndGiveTheSlotsOfThreadsBack) {
    const auto cycle = [](int count) {
        for (int i = 0; i < count; ++i) {
            { const Loaded plugin({Start, Use, RunAThread, Stop}); }
            ASSERT_FALSE(loading::IsLibraryLoaded());
        }
    };
    cycle(200); // until the system's own tables have their size
    const std::size_t before = loading::PrivateBytes(), slot = loading::FirstFreeSlot();
    const char* wanted = std::getenv("TAVO_LOAD_CYCLES"); // for a soak
    cycle(wanted ? std::atoi(wanted) : 500);
    EXPECT_LE(loading::PrivateBytes(), before + kMostGrowth);
    EXPECT_EQ(loading::FirstFreeSlot(), slot) << "of threads; there are few";
}

#if defined(TAVO_TEST_TRIMS)
TEST(Loading, SweepsGiveThePoolsMemoryBackToTheSystem) {
    const Loaded plugin({Use});
    const std::size_t before = loading::PrivateBytes();
    plugin.Do(Fill);
    const std::size_t filled = loading::PrivateBytes() - before;
    plugin.Do(Sweep);
    std::this_thread::sleep_for(std::chrono::milliseconds(600)); // the heap waits whether it is needed again
    plugin.Do(Sweep);
    EXPECT_LT(loading::PrivateBytes(), before + filled / 2);
}
#endif

TEST(Loading, ForgottenServicesKeepTheLibrary) {
    { const Loaded plugin({Start, Use}); }
    EXPECT_TRUE(loading::IsLibraryLoaded()) << "its thread runs there";
    { const Loaded plugin({Use, Stop}); }
    EXPECT_FALSE(loading::IsLibraryLoaded());
}

TEST(Loading, ThreadsThatUsedTheLibraryMayOutliveIt) {
    support::Gate used, gone;
    std::thread thread;
    {
        const Loaded plugin({Start, KeepHandles});
        thread = std::thread([&] {
            plugin.Do(Use);
            used.Step();
            gone.Reached(1);
        });
        ASSERT_TRUE(used.Reached(1));
        plugin.Do(Stop);
    }
    EXPECT_FALSE(loading::IsLibraryLoaded());
    gone.Step();
    thread.join();
}
