#pragma once
// Keeps what the library asserts while it lives.

#include <cstdarg>
#include <mutex>
#include <string>
#include <TAVO/develop.h>
#include <utility>
#include <vector>

namespace support {

class Assertions {
public:
    Assertions() {
        Take();
        TAVO::Develop::SetExternalLogger(Keep);
    }
    ~Assertions() { TAVO::Develop::SetExternalLogger(nullptr); }
    Assertions(const Assertions&) = delete;
    Assertions& operator=(const Assertions&) = delete;

    // The texts since the last call; captions left out.
    static std::vector<std::string> Take() {
        const std::lock_guard<std::mutex> lock(g_mutex);
        return std::exchange(g_texts, {});
    }

private:
    static void Keep(_acfDebugLevel level, const wchar_t*, const char*, TAVO::long32, const wchar_t* format,
                     std::va_list arguments) {
        if (level != acfDebugError || *format != L'F') return; // "Failed assumption: %hs:%hs"
        va_arg(arguments, const char*);
        const std::lock_guard<std::mutex> lock(g_mutex);
        g_texts.emplace_back(va_arg(arguments, const char*));
    }

    inline static std::mutex g_mutex;
    inline static std::vector<std::string> g_texts;
};

using Texts = std::vector<std::string>;

} // namespace support
