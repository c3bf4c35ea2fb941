// Start, process facts, allocation, random numbers.

#include "contract.h"

#include <cstring>
#include <TAVO/core.h>
#include <TAVO/develop.h>
#include <TAVO/string.h>

namespace contract {

using namespace TAVO;

void Core() {
    const wchar_t* const start = Core::OS::GetStartupPath();
    Is("the startup path is a separator and the start of the file name", start[0] == L'/' || start[0] == L'\\');
    Is("the platform is Windows everywhere", String::wcscmpi(Core::OS::GetPlatformString(), L"windows") == 0);

    const bool first = AppInit(), second = AppInit();
    AppExit();
    AppExit();
    Is("a second AppInit answers true at once, and is paired with an AppExit too", first && second);

    void* const block = Core::OS::_frealloc(Core::OS::_falloc(8), 0);
    Is("a size of 0 keeps a block", block != nullptr);
    Core::OS::_ffree(block);
    Is("null cannot be enlarged", Core::OS::_frealloc(nullptr, 8) == nullptr);

    Develop::CHFLapse watch(L"watch");
    watch.Stop();
    Is("a stopwatch counts twice the time that it kept", watch.count_double() == 2 * watch.lapse_nano() / 1e9);
    Instead("lapse_double tells the time", watch.lapse_double() == watch.lapse_nano() / 1e9);

    Develop::CMTRandom random;
    random.maxrnd(0xFFFFFFFF);
    random.seed(5489);
    Is("the first number of a seed is the seed itself, tempered, and not the reference twister's",
       random.rnd() != 3499211612u);
}

} // namespace contract
