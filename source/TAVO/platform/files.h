#pragma once
// What the library needs of the file system, once for both systems.
//
// No function here throws. Paths are 16-bit units, zero-terminated and neither null nor empty; '/' and '\' both
// separate.

#include <cstddef>
#include <cstdint>
#include <TAVO/config.h>

namespace TAVO::Platform {

// --- files ----------------------------------------------------------------------------------------------------------

// The system's handle in the system's own form; all bits set where there is none.
using FileHandle = std::intptr_t;
constexpr FileHandle kNoFile = -1;

enum class Disposition { OpenExisting, TruncateExisting, OpenAlways, CreateAlways };

struct FileRequest {
    bool write; // besides reading
    bool random;
    bool shareRead;
    bool shareWrite;
    bool temporary; // deleted by CloseFile
    Disposition disposition;
};

enum class OpenResult { Opened, PathNotFound, Failed };

// PathNotFound: the folder that should hold the file does not exist. `file` is written only when Opened.
OpenResult OpenFile(const wchar_t* path, const FileRequest& request, FileHandle& file) noexcept;
void CloseFile(FileHandle file) noexcept;

bool GetFileLength(FileHandle file, std::uint64_t& length) noexcept;
enum class Origin { Start, Position };
// The new position goes to `position` (may be null). False, without moving, for places below 0 or beyond 2^63-1.
bool MoveFilePosition(FileHandle file, std::int64_t distance, Origin origin, std::uint64_t* position) noexcept;
bool EndFileAtPosition(FileHandle file) noexcept;
bool FlushFile(FileHandle file) noexcept;
// One transfer; `done` may be smaller than `size` and is 0 on failure. Reading at the end succeeds with 0.
bool ReadFromFile(FileHandle file, void* buffer, std::uint32_t size, std::uint32_t& done) noexcept;
bool WriteToFile(FileHandle file, const void* buffer, std::uint32_t size, std::uint32_t& done) noexcept;

// --- paths ----------------------------------------------------------------------------------------------------------

enum class PathKind { Missing, File, Directory }; // whatever exists and is no directory is a file

PathKind GetPathKind(const wchar_t* path) noexcept;
bool RemoveFile(const wchar_t* path) noexcept;                                // never a directory
bool RenameWithoutReplacing(const wchar_t* from, const wchar_t* to) noexcept; // false when `to` exists
bool MakeDirectory(const wchar_t* path) noexcept;                             // false when it exists

// --- directories ----------------------------------------------------------------------------------------------------

constexpr std::size_t kNameCapacity = 260; // units of an entry's name, terminator included

struct EntryFacts {
    std::uint64_t size;                        // 0 for a directory
    std::uint64_t modified, accessed, created; // 100 ns since 1601-01-01 UTC, 0 when unknown
    bool directory;
    bool readOnly;
};

// An open directory; null when it cannot be read. An empty path is the current directory.
void* OpenDirectory(const wchar_t* path) noexcept;
// The next name, "." and ".." left out; false after the last.
bool NextName(void* directory, wchar_t (&name)[kNameCapacity]) noexcept;
// The facts about the entry that NextName gave last; false when it is gone.
bool DescribeEntry(void* directory, EntryFacts& facts) noexcept;
void CloseDirectory(void* directory) noexcept;

} // namespace TAVO::Platform
