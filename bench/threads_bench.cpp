// Events and threads against the primitives under them and the standard library's.

#include <benchmark/benchmark.h>
#include <boost/thread/condition_variable.hpp>
#include <boost/thread/mutex.hpp>
#include <boost/thread/thread_only.hpp>
#include <condition_variable>
#include <mutex>
#include <semaphore>
#include <TAVO/threading.h>
#include <thread>

namespace {

using namespace TAVO::Threading;

// An auto-reset event as one would write it with a condition.
template <class Mutex, class Condition> class ByCondition {
public:
    void Set() {
        {
            const std::lock_guard<Mutex> lock(m_mutex);
            m_set = true;
        }
        m_condition.notify_one();
    }
    void Wait() {
        Lock lock(m_mutex);
        while (!m_set) m_condition.wait(lock);
        m_set = false;
    }

private:
    using Lock = std::conditional_t<std::is_same_v<Mutex, std::mutex>, std::unique_lock<std::mutex>,
                                    boost::unique_lock<boost::mutex>>;
    Mutex m_mutex;
    Condition m_condition;
    bool m_set = false;
};
using StdCondition = ByCondition<std::mutex, std::condition_variable>;
using BoostCondition = ByCondition<boost::mutex, boost::condition_variable>;

struct Semaphore {
    void Set() { semaphore.release(); }
    void Wait() { semaphore.acquire(); }
    std::binary_semaphore semaphore{0};
};

struct Event {
    void Set() { event.Set(); }
    void Wait() { event.Wait(WaitForever); }
    CPEvent event{false};
};

// The first of two, the second one set.
struct SecondOfTwo {
    SecondOfTwo() { several.Attach(stop), several.Attach(event); }
    void Set() { event.Set(); }
    void Wait() { several.Wait(WaitForever); }
    CPEvent stop{true}, event{false};
    CPMultipleEvent several;
};

template <class Signal> void SetAndWait(benchmark::State& state) {
    Signal signal;
    for (auto _ : state) {
        signal.Set();
        signal.Wait();
    }
}

// There and back.
template <class Signal> void HandOver(benchmark::State& state) {
    Signal there, back;
    std::atomic<bool> stop{false};
    std::thread other([&] {
        for (;;) {
            there.Wait();
            if (stop) return;
            back.Set();
        }
    });
    for (auto _ : state) {
        there.Set();
        back.Wait();
    }
    stop = true;
    there.Set();
    other.join();
}

struct Nothing {
    static constexpr _acfUID uid = {1, 2, 3, {}};
    void Run(unsigned long long) {}
};

template <class Thread> void StartAndJoin(benchmark::State& state) {
    for (auto _ : state) Thread([] {}).join();
}
template <> void StartAndJoin<CPThread>(benchmark::State& state) {
    const auto object = CThreadWrapper<Nothing>::Create();
    for (auto _ : state) {
        CPThread thread;
        thread.Execute(object, 0);
        thread.Wait(WaitForever);
    }
}

BENCHMARK_TEMPLATE(SetAndWait, Event);
BENCHMARK_TEMPLATE(SetAndWait, SecondOfTwo);
BENCHMARK_TEMPLATE(SetAndWait, StdCondition);
BENCHMARK_TEMPLATE(SetAndWait, BoostCondition);
BENCHMARK_TEMPLATE(SetAndWait, Semaphore);
BENCHMARK_TEMPLATE(HandOver, Event)->UseRealTime();
BENCHMARK_TEMPLATE(HandOver, SecondOfTwo)->UseRealTime();
BENCHMARK_TEMPLATE(HandOver, StdCondition)->UseRealTime();
BENCHMARK_TEMPLATE(HandOver, BoostCondition)->UseRealTime();
BENCHMARK_TEMPLATE(HandOver, Semaphore)->UseRealTime();
BENCHMARK_TEMPLATE(StartAndJoin, CPThread)->UseRealTime();
BENCHMARK_TEMPLATE(StartAndJoin, std::thread)->UseRealTime();
BENCHMARK_TEMPLATE(StartAndJoin, boost::thread)->UseRealTime();

} // namespace
