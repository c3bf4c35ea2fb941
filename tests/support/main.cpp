// The test programs' main: watches the library's heap and reports every test that leaves blocks behind.

#include "heapwatch.h"
#include "platform/heap.h"
#include "texts.h"

#include <atomic>
#include <TAVO/acf.h>

namespace {

std::atomic<std::int64_t> g_live{0};
std::atomic<std::int64_t> g_allowed{-1}; // -1: no limit
std::atomic<bool> g_refused{false};

bool MayAllocate(std::size_t) {
    auto allowed = g_allowed.load();
    while (allowed > 0)
        if (g_allowed.compare_exchange_weak(allowed, allowed - 1)) return true;
    if (allowed < 0) return true;
    g_refused = true;
    return false;
}

constexpr TAVO::Platform::HeapObserver kObserver{MayAllocate, [] { ++g_live; }, [] { --g_live; }};

// Tests whose name or suite contains "KeepsBlocks" may leave blocks behind.
class LeakListener : public testing::EmptyTestEventListener {
    void OnTestStart(const testing::TestInfo&) override { m_before = g_live; }
    void OnTestEnd(const testing::TestInfo& info) override {
        support::Sweep();
        const auto left = g_live - m_before;
        const std::string name = std::string(info.test_suite_name()) + "." + info.name();
        if (left > 0 && name.find("KeepsBlocks") == std::string::npos && !info.result()->Failed())
            ADD_FAILURE() << name << " left " << left << " blocks of the library's heap behind";
    }
    std::int64_t m_before = 0;
};

} // namespace

namespace support {

std::int64_t LiveBlocks() { return g_live; }
FailingHeap::FailingHeap(std::int64_t allowed) {
    g_refused = false;
    g_allowed = allowed;
}
FailingHeap::~FailingHeap() { g_allowed = -1; }
bool FailingHeap::Refused() const { return g_refused; }

} // namespace support

int main(int argc, char** argv) {
    testing::InitGoogleTest(&argc, argv);
    TAVO::Platform::SetHeapObserver(&kObserver);
    TAVO::String::CPPoolString(L"Capital"); // builds the pool's tables, the one for capital letters too; they stay
    TAVO::ACF::CPIACFUnknown::Factory_UnregisterClass({}); // the same for the lock of the class registry
    support::Sweep();
    testing::UnitTest::GetInstance()->listeners().Append(new LeakListener);
    return RUN_ALL_TESTS();
}
