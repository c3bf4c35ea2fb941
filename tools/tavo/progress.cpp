#include "progress.h"

#include "console.h"

#include <cstdio>
#include <TAVO/develop.h>

namespace tool {

namespace {

constexpr unsigned long long kPatience = 500; // milliseconds before the first line
constexpr unsigned long long kPause = 100;    // and between two

} // namespace

Progress::Progress(const char* work, std::size_t total)
    : m_work(work), m_total(total), m_terminal(console::IsErrorTerminal()),
      m_next(TAVO::Develop::_now_milli() + kPatience) {}

Progress::~Progress() { Hide(); }

void Progress::Step(const std::string& name) {
    ++m_step;
    if (!m_terminal || TAVO::Develop::_now_milli() < m_next) return;
    m_next = TAVO::Develop::_now_milli() + kPause;
    std::fflush(stdout);
    std::fprintf(stderr, "\r\x1b[K%s %zu of %zu: %s", m_work, m_step, m_total, name.c_str());
    std::fflush(stderr);
    m_shown = true;
}

void Progress::Hide() {
    if (!m_shown) return;
    std::fprintf(stderr, "\r\x1b[K");
    std::fflush(stderr);
    m_shown = false;
}

} // namespace tool
