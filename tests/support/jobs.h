#pragma once
// Runs a test's lambda on a thread of the library.

#include <functional>
#include <TAVO/threading.h>
#include <thread>

namespace support {

struct Call {
    static constexpr _acfUID uid = {0x11223344, 0x5566, 0x7788, {1, 2, 3, 4, 5, 6, 7, 8}};
    void Run(unsigned long long body) { (*reinterpret_cast<std::function<void()>*>(body))(); }
};
using Wrapper = TAVO::Threading::CThreadWrapper<Call>;

// A thread that runs `body`. Waits for its end, also when the thread was left to itself.
struct Job {
    explicit Job(std::function<void()> work) : body(std::move(work)), object(Wrapper::Create()) {
        thread.Execute(object, reinterpret_cast<std::size_t>(&body));
    }
    ~Job() {
        thread.Wait(TAVO::Threading::WaitForever);
        while (object.lockcnt() > 1) std::this_thread::yield();
    }
    Job(const Job&) = delete;
    Job& operator=(const Job&) = delete;

    unsigned State() const { return Wrapper::From(object)->GetState(); }

    std::function<void()> body;
    TAVO::Buffers::CPObjectMemory object;
    TAVO::Threading::CPThread thread;
};

} // namespace support
