// The stopwatch: how long work takes, told to the log.

#include <cstdio>
#include <TAVO/develop.h>

using namespace TAVO;
using Develop::CHFLapse;

static int g_lines = 0;

// The category of a stopwatch's line is its name with the time: "indexing - 1.23ms".
static void Log(_acfDebugLevel, const wchar_t* category, const char*, long32, const wchar_t* label, std::va_list) {
    const String::CUTF8Char line(category), what(label);
    std::printf("%s: %s\n", reinterpret_cast<const char*>(*line), reinterpret_cast<const char*>(*what));
    ++g_lines;
}

static std::size_t Work() {
    std::size_t strings = 0;
    for (int i = 0; i < 10000; ++i) strings += String::CPPoolString(i).isdef();
    return strings;
}

int main() {
    Develop::SetExternalLogger(Log);
    bool fine = true;
    {
        CHFLapse watch(L"indexing"); // runs from here
        fine = Work() == 10000;
        watch.Lapse(L"first half"); // the time since the start; runs on
        fine = Work() == 10000 && fine;
    } // a named watch that still runs tells its total

    // Without a name a watch stands, and tells only what it is asked.
    CHFLapse quiet{String::CPPoolString()};
    quiet.Start();
    Work();
    quiet.Stop();
    std::printf("%.3f ms once more\n", quiet.lapse_double() * 1000);
    Develop::SetExternalLogger(nullptr);
    return fine && g_lines == 2 && quiet.lapse_nano() > 0 ? 0 : 1;
}
