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
    std::string type; // one of ValueTypeNames; empty for the text as it is
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
    unsigned watch = 0; // seconds
};
int PoolStat(const PoolStatOptions& options);

struct TcSystemsOptions {
    bool json = false;
};
int TcSystems(const TcSystemsOptions& options);

// A system is a name, a code or a rate; an empty one is not given.
struct TcConvertOptions {
    std::string text, from, to;
    bool align = false, retime = false; // neither: the count stays
    bool json = false;
};
int TcConvert(const TcConvertOptions& options);

struct TcSumOptions {
    std::string left, right, system;
    bool json = false;
};
int TcAdd(const TcSumOptions& options);
int TcSub(const TcSumOptions& options);

struct TcShowOptions {
    std::string text, system;
    bool json = false;
};
int TcShow(const TcShowOptions& options);

struct TcTableOptions {
    std::string text, system; // without text around the first minute of the system
    unsigned frames = 4;      // on each side
    bool json = false;
};
int TcTable(const TcTableOptions& options);

struct TcCheckOptions {
    std::vector<std::string> texts;
    std::string system;
    bool json = false;
};
int TcCheck(const TcCheckOptions& options);

struct RationalApproxOptions {
    std::string number;
    unsigned maxDenominator = 0;
    bool json = false;
};
int RationalApprox(const RationalApproxOptions& options);

struct IdNewOptions {
    unsigned count = 1;
    bool json = false;
};
int IdNew(const IdNewOptions& options);

struct IdTextOptions {
    std::vector<std::string> texts;
    bool json = false;
};
int IdParse(const IdTextOptions& options);
int IdFormat(const IdTextOptions& options);

struct CodecOptions {
    std::string code; // one of CodecNames
    std::string file = "-", output = "-";
    std::string nibbles = "high-first"; // one of NibbleOrders, for hex
    bool strict = false;                // encoding what would not come back writes nothing
};
int CodecEncode(const CodecOptions& options);
int CodecDecode(const CodecOptions& options);

std::vector<std::string> CodecNames();
std::vector<std::string> NibbleOrders();

// A name, or width and polynomial; the numbers are hexadecimal.
struct CrcOptions {
    std::vector<std::string> files; // none: standard input
    std::string name, polynomial, initial, xorOut;
    unsigned width = 0;
    bool reflectIn = false, reflectOut = false;
    bool list = false, json = false;
};
int Crc(const CrcOptions& options);

struct UrlTextOptions {
    std::vector<std::string> texts;
    std::string keep; // bytes that stay as they are
    bool json = false;
};
int UrlEncode(const UrlTextOptions& options);
int UrlDecode(const UrlTextOptions& options);
int UrlFromPath(const UrlTextOptions& options);
int UrlToPath(const UrlTextOptions& options);

// An encoding is one of TextFormatNames; an empty one is that of the text's mark, or UTF-8.
struct TextOptions {
    std::vector<std::string> files;
    std::string from;
    bool json = false;
};
int TextCount(const TextOptions& options);
int TextValidate(const TextOptions& options);

struct TextRecodeOptions {
    std::string file, from, to, output;
    bool strict = false; // what comes out changed is not written
};
int TextRecode(const TextRecodeOptions& options);

int About();

} // namespace tool
