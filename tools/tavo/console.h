#pragma once
// The tool's own platform layer: arguments, standard streams, terminals and the size of the process.

#include <cstddef>
#include <string>
#include <vector>

namespace tool::console {

// Makes the standard streams carry bytes, and a terminal show UTF-8, until the process ends.
void Prepare();

// The command line without the program's name, in UTF-8. A name that is no Unicode keeps its bytes.
std::vector<std::string> Arguments(int argc, char** argv);

// The terminal's standard error, where progress may be shown.
bool IsErrorTerminal();

// Bytes of memory that belong to this process alone; 0 when the system does not tell.
std::size_t ProcessMemory();

} // namespace tool::console
