#pragma once
// Runs the command-line tool, which stands beside the test program.

#include <string>
#include <vector>

namespace support {

struct Finished {
    int code = -1;      // -1: it did not run or did not end by itself
    std::string output; // what it wrote to its standard streams
    std::string errors;
};

// Arguments in UTF-8, without the program's name. Its standard streams are files, never terminals.
Finished RunTool(const std::vector<std::string>& arguments, const std::string& input = std::string());

} // namespace support
