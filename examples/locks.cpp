// Locks: a plain one, one that its owner may take again, and one for many readers or one writer.

#include <cstdio>
#include <TAVO/threading.h>
#include <thread>
#include <vector>

using namespace TAVO::Threading;

// Leaves when the block ends, whichever way it ends.
template <class Lock> class Held {
public:
    explicit Held(const Lock& lock) : m_lock(lock) { m_lock.Enter(); }
    ~Held() { m_lock.Leave(); }
    Held(const Held&) = delete;
    Held& operator=(const Held&) = delete;

private:
    const Lock m_lock; // a copy of the handle is the same lock
};

int main() {
    constexpr int kThreads = 4;
    constexpr int kRounds = 1000;
    const CPMutex mutex;
    const CPRWInterlock table;
    long long sum = 0;
    std::vector<int> rows;

    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t)
        threads.emplace_back([&, t] {
            for (int i = 0; i < kRounds; ++i) {
                {
                    const Held<CPMutex> held(mutex);
                    sum += i;
                }
                if (i % 100 == 0) {
                    const Held<CPRWInterlock> held(table); // the writer, alone
                    rows.push_back(t);
                }
                table.EnterRead(); // readers, together
                const bool more = rows.size() > std::size_t{kThreads} * kRounds;
                table.LeaveRead();
                if (more) return;
            }
        });
    for (std::thread& thread : threads) thread.join();

    // A critical section counts how often its owner came in; a mutex would block for ever.
    const CPCriticalSection section;
    const Held<CPCriticalSection> outer(section);
    const Held<CPCriticalSection> inner(section);

    // Waiting may have an end, in milliseconds.
    bool refused = false;
    std::thread([&] { refused = !section.TryEnter(10); }).join();

    std::printf("sum %lld, %zu rows, a held lock %s\n", sum, rows.size(), refused ? "was refused" : "was given");
    const bool fine = sum == kThreads * (kRounds * (kRounds - 1LL) / 2) && rows.size() == kThreads * kRounds / 100;
    return fine && refused ? 0 : 1;
}
