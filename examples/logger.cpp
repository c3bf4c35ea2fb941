// A host's logger: what the library has to say reaches the host instead of the debugger.

#include <cstdio>
#include <string>
#include <TAVO/develop.h>
#include <TAVO/string.h>
#include <TAVO/xml.h>

using TAVO::String::CUTF8Char;

static std::string g_last;

// Formats are wide and arrive with their arguments. This one knows %ls and %d, which a logger for all lines would
// extend; it may be called from several threads at once, so a real one would take a lock here.
static void Log(_acfDebugLevel level, const wchar_t* category, const char* source, TAVO::long32 line,
                const wchar_t* format, std::va_list arguments) {
    std::string text;
    for (; *format; ++format) {
        if (format[0] == L'%' && format[1] == L'l' && format[2] == L's') {
            const CUTF8Char piece(va_arg(arguments, const wchar_t*));
            if (piece) text += reinterpret_cast<const char*>(*piece);
            format += 2;
        } else if (format[0] == L'%' && format[1] == L'd') {
            text += std::to_string(va_arg(arguments, int));
            ++format;
        } else {
            text += *format < 0x80 ? static_cast<char>(*format) : '?';
        }
    }
    const CUTF8Char kind(category);
    std::printf("level %d, %s, %s line %d: %s\n", static_cast<int>(level),
                kind ? reinterpret_cast<const char*>(*kind) : "no category", source ? source : "no source",
                static_cast<int>(line), text.c_str());
    g_last = text;
}

int main() {
    TAVO::Develop::SetExternalLogger(Log);

    // The library logs every parse error once, as a warning.
    TAVO::XML::CXMLDoc document;
    if (document.OpenDocText(L"<reel><clip></reel>")) return 1;
    bool fine = g_last.find("XML parsing error [Bad termination tag, Line 1, Offset 12]") == 0;

    // A host's own lines take the same road.
    TAVO::Develop::_logWrite(acfDebugInfo, L"host.import", "host/import", __LINE__, L"%d clips of %ls", 12, L"Reel 1");
    fine = fine && g_last == "12 clips of Reel 1";

    // Lines that follow go to the debugger again.
    TAVO::Develop::SetExternalLogger(nullptr);
    TAVO::Develop::_logWrite(acfDebugInfo, L"host.import", nullptr, 0, L"unheard");
    return fine && g_last == "12 clips of Reel 1" ? 0 : 1;
}
