#include "console.h"

#include <cstdio>
#include <unistd.h>

namespace tool::console {

void Prepare() {}

std::vector<std::string> Arguments(int argc, char** argv) {
    return argc > 1 ? std::vector<std::string>(argv + 1, argv + argc) : std::vector<std::string>();
}

bool IsErrorTerminal() { return isatty(STDERR_FILENO) == 1; }

std::size_t ProcessMemory() {
    unsigned long resident = 0;
    unsigned long shared = 0;
    std::FILE* file = std::fopen("/proc/self/statm", "r");
    if (!file) return 0;
    const int fields = std::fscanf(file, "%*u %lu %lu", &resident, &shared);
    std::fclose(file);
    return fields == 2 && resident > shared ? (resident - shared) * static_cast<std::size_t>(sysconf(_SC_PAGESIZE)) : 0;
}

} // namespace tool::console
