#pragma once
// How far long work is: one line on a terminal, from half a second on; nothing anywhere else.

#include <cstddef>
#include <string>

namespace tool {

class Progress {
public:
    Progress(const char* work, std::size_t total);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    // One more of the total begins.
    void Step(const std::string& name);
    // Takes the line away, for output that follows.
    void Hide();

private:
    const char* m_work;
    std::size_t m_total;
    std::size_t m_step = 0;
    bool m_terminal;
    bool m_shown = false;
    unsigned long long m_next; // when to show the next line, in milliseconds
};

} // namespace tool
