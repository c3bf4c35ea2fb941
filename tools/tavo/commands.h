#pragma once
// The tool's commands, each with what the command line gave it. All give an exit code.

#include <string>
#include <vector>

namespace tool {

struct CheckOptions {
    std::vector<std::string> files;
    bool keepGoing = false;
};
int Check(const CheckOptions& options);

struct TreeOptions {
    std::string file;
    bool json = false;
};
int Tree(const TreeOptions& options);

struct GetOptions {
    std::string file, path, attribute;
};
int Get(const GetOptions& options);

struct OutputOptions {
    std::string file;
    std::string encoding = "utf-8"; // one of EncodingNames
    bool pretty = false;
    bool strict = false; // what would read back changed is not written
};

std::vector<std::string> EncodingNames();

struct SetOptions {
    std::string file, path, attribute, text;
    OutputOptions output;
};
int Set(const SetOptions& options);

struct FormatOptions {
    std::string file;
    OutputOptions output;
};
int Format(const FormatOptions& options);

struct StatOptions {
    std::vector<std::string> files;
    unsigned repeat = 5;
};
int Stat(const StatOptions& options);

struct PoolStatOptions {
    std::vector<std::string> files;
};
int PoolStat(const PoolStatOptions& options);

int About();

} // namespace tool
