#include "streams.h"

#include "text.h"

#include <TAVO/files.h>

namespace tool {

namespace {

using namespace TAVO::Files::OS;

constexpr std::size_t kChunk = std::size_t{1} << 20;
constexpr std::size_t kLargest = 0xFFFFFFFF; // the library's limit for a document

bool g_outputLost = false;

bool Fail(std::string& trouble, const char* reason) {
    trouble = reason;
    return false;
}

// Reads to the end, whatever size the file claims to have: a pipe has none. `read` gives the bytes it got, 0 at the
// end, all-ones for failure.
constexpr std::size_t kFailed = ~std::size_t{0};
template <class Read>
bool ReadToEnd(std::string& trouble, const std::function<void(std::string_view)>& take, Read read) {
    std::string piece(kChunk, 0);
    while (const std::size_t got = read(piece.data())) {
        if (got == kFailed) return Fail(trouble, "cannot be read");
        take(std::string_view(piece).substr(0, got));
    }
    return true;
}

} // namespace

bool ReadPieces(const std::string& name, std::string& trouble, const std::function<void(std::string_view)>& take) {
    if (name == "-")
        return ReadToEnd(trouble, take, [](char* target) {
            const std::size_t got = std::fread(target, 1, kChunk, stdin);
            return got == 0 && std::ferror(stdin) ? kFailed : got;
        });

    WideText path;
    if (!ToWide(name, Pairs::Standard, path)) return Fail(trouble, "its name is not Unicode");
    if (_TestDirExists(path)) return Fail(trouble, "is a folder");
    // Asked first, since opening a file in a missing folder would make that folder.
    if (!_TestFileExists(path)) return Fail(trouble, "does not exist");
    CFile file;
    if (!file.Open(path, FileAccessRead | FileAccessShareRead | FileAccessShareWrite, OpenFileExisting))
        return Fail(trouble, "cannot be opened");
    return ReadToEnd(trouble, take, [&](char* target) {
        TAVO::ulong32 done = 0;
        return file.Read(target, kChunk, &done) ? std::size_t{done} : kFailed;
    });
}

bool ReadAll(const std::string& name, std::string& bytes, std::string& trouble) {
    bytes.clear();
    bool tooLarge = false;
    const bool read = ReadPieces(name, trouble, [&](std::string_view piece) {
        tooLarge = tooLarge || bytes.size() + piece.size() > kLargest;
        if (!tooLarge) bytes += piece;
    });
    if (read && tooLarge) return Fail(trouble, "is too large: it may have 4,294,967,295 bytes");
    return read;
}

bool WriteAll(const std::string& name, std::string_view bytes, std::string& trouble) {
    if (name == "-") {
        Print(bytes);
        return true;
    }
    WideText path;
    if (!ToWide(name, Pairs::Standard, path)) return Fail(trouble, "its name is not Unicode");
    CFile file;
    if (!file.Open(path, FileAccessWrite | FileAccessShareRead, OpenFileCreate | OpenFileTruncate))
        return Fail(trouble, "cannot be opened for writing");
    while (!bytes.empty()) {
        TAVO::ulong32 done = 0;
        const auto piece = static_cast<TAVO::ulong32>(bytes.size() < kChunk ? bytes.size() : kChunk);
        if (!file.Write(bytes.data(), piece, &done) || done == 0) return Fail(trouble, "cannot be written");
        bytes.remove_prefix(done);
    }
    return true;
}

void Print(std::string_view text) {
    if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size()) g_outputLost = true;
}

void Complain(std::string_view text) {
    std::fflush(stdout);
    std::fprintf(stderr, "tavo: %.*s\n", static_cast<int>(text.size()), text.data());
}

int Finish(int code) {
    if (std::fflush(stdout) != 0) g_outputLost = true;
    if (!g_outputLost) return code;
    Complain("standard output cannot be written");
    return kFileTrouble;
}

} // namespace tool
