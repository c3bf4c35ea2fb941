#pragma once
// Runs the command-line tool, which stands beside the test program.

#include <cstdlib>
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

// The tool's path; there is none on Windows, which finds it by itself.
std::string ToolPath();

// How often `tavo xml stat` has to read a document to be busy for about that many milliseconds on this machine.
inline std::string RepeatsFor(double milliseconds, const std::string& document) {
    const std::string output = RunTool({"xml", "stat", "--repeat", "20", document}).output;
    const auto number = output.rfind(' ', output.find(" ms on average") - 1);
    const double once = number < output.size() ? std::atof(output.c_str() + number) : 0;
    return std::to_string(once > 0 ? static_cast<int>(milliseconds / once) + 1 : 1);
}

} // namespace support
