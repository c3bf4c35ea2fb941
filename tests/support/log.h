#pragma once
// Keeps what the library tells the log while it lives.

#include <cstdarg>
#include <mutex>
#include <string>
#include <TAVO/develop.h>
#include <utility>
#include <vector>

namespace support {

using Texts = std::vector<std::string>;

inline std::string Ascii(const wchar_t* text) {
    std::string ascii;
    for (; text && *text; ++text) ascii += static_cast<char>(*text);
    return ascii;
}

class Log {
public:
    Log() {
        Take();
        TAVO::Develop::SetExternalLogger(Keep);
    }
    ~Log() { TAVO::Develop::SetExternalLogger(nullptr); }
    Log(const Log&) = delete;
    Log& operator=(const Log&) = delete;

    // The lines since the last call: "level category source:line format|argument|argument".
    static Texts Take() {
        const std::lock_guard<std::mutex> lock(g_mutex);
        return std::exchange(g_lines, {});
    }

    // Understands the conversions that the library itself and these tests pass.
    static void Keep(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
                     const wchar_t* format, std::va_list arguments) {
        std::string kept = std::to_string(level) + ' ' + (category ? Ascii(category) : "none") + ' ' +
                           (source ? source : "none") + ':' + std::to_string(line) + ' ' + Ascii(format);
        for (; *format; ++format) {
            if (*format != L'%') continue;
            ++format;
            if (*format == L'h') (kept += '|') += va_arg(arguments, const char*);
            if (*format == L'l') (kept += '|') += Ascii(va_arg(arguments, const wchar_t*));
            if (*format == L'd' || *format == L'u' || *format == L'x')
                (kept += '|') += std::to_string(va_arg(arguments, unsigned));
        }
        const std::lock_guard<std::mutex> lock(g_mutex);
        g_lines.push_back(kept);
    }

private:
    inline static std::mutex g_mutex;
    inline static Texts g_lines;
};

// Keeps what it asserts.
struct Assertions : Log {
    // The texts since the last call; captions left out.
    static Texts Take() {
        Texts texts;
        for (const std::string& line : Log::Take())
            if (line.find(" Failed assumption: %hs:%hs|") != line.npos)
                texts.push_back(line.substr(line.find('|', line.find('|') + 1) + 1));
        return texts;
    }
};

} // namespace support
