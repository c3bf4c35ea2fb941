// Locks against the primitives under them and the standard library's, alone and with a second thread.

#include <benchmark/benchmark.h>
#include <boost/thread/mutex.hpp>
#include <boost/thread/shared_mutex.hpp>
#include <mutex>
#include <TAVO/threading.h>
#include <thread>

namespace {

using namespace TAVO::Threading;

// The C library leaves out the locked instructions until a process starts its first thread: measure what hosts see.
const bool g_threaded = [] {
    std::thread([] {}).join();
    return true;
}();

// One lock of each kind for all threads of a run; entering and leaving under one pair of names.
template <class Lock> Lock& Shared() {
    static Lock lock;
    return lock;
}
template <class Lock> void Enter(Lock& lock) { lock.lock(); }
template <class Lock> void Leave(Lock& lock) { lock.unlock(); }
template <> void Enter(CPMutex& lock) { lock.Enter(); }
template <> void Leave(CPMutex& lock) { lock.Leave(); }
template <> void Enter(CPCriticalSection& lock) { lock.Enter(); }
template <> void Leave(CPCriticalSection& lock) { lock.Leave(); }
template <> void Enter(CPRWInterlock& lock) { lock.Enter(); }
template <> void Leave(CPRWInterlock& lock) { lock.Leave(); }

void EnterRead(CPRWInterlock& lock) { lock.EnterRead(); }
void LeaveRead(CPRWInterlock& lock) { lock.LeaveRead(); }
void EnterRead(boost::shared_mutex& lock) { lock.lock_shared(); }
void LeaveRead(boost::shared_mutex& lock) { lock.unlock_shared(); }

template <class Lock> void EnterAndLeave(benchmark::State& state) {
    auto& lock = Shared<Lock>();
    for (auto _ : state) {
        Enter(lock);
        Leave(lock);
    }
}

template <class Lock> void EnterAgain(benchmark::State& state) {
    Lock lock;
    Enter(lock);
    for (auto _ : state) {
        Enter(lock);
        Leave(lock);
    }
    Leave(lock);
}

template <class Lock> void Read(benchmark::State& state) {
    auto& lock = Shared<Lock>();
    for (auto _ : state) {
        EnterRead(lock);
        LeaveRead(lock);
    }
}

BENCHMARK_TEMPLATE(EnterAndLeave, CPMutex)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAndLeave, CPCriticalSection)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAndLeave, boost::timed_mutex)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAndLeave, std::recursive_mutex)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAndLeave, CPRWInterlock)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAndLeave, boost::shared_mutex)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(EnterAgain, CPCriticalSection);
BENCHMARK_TEMPLATE(EnterAgain, CPRWInterlock);
BENCHMARK_TEMPLATE(EnterAgain, std::recursive_mutex);
BENCHMARK_TEMPLATE(Read, CPRWInterlock)->ThreadRange(1, 2);
BENCHMARK_TEMPLATE(Read, boost::shared_mutex)->ThreadRange(1, 2);

} // namespace
