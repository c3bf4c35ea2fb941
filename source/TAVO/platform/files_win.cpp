// Files of Windows: thin fronts of the system's calls.

#include "files.h"

#include "heap.h"

#include <windows.h>

namespace TAVO::Platform {

namespace {

HANDLE SystemHandle(FileHandle file) { return reinterpret_cast<HANDLE>(file); }

DWORD CreationOf(Disposition disposition) {
    switch (disposition) {
    case Disposition::TruncateExisting:
        return TRUNCATE_EXISTING;
    case Disposition::OpenAlways:
        return OPEN_ALWAYS;
    case Disposition::CreateAlways:
        return CREATE_ALWAYS;
    default:
        return OPEN_EXISTING;
    }
}

} // namespace

OpenResult OpenFile(const wchar_t* path, const FileRequest& request, FileHandle& file) noexcept {
    const DWORD access = GENERIC_READ | (request.write ? GENERIC_WRITE : 0);
    const DWORD share = (request.shareRead ? FILE_SHARE_READ : 0) | (request.shareWrite ? FILE_SHARE_WRITE : 0);
    const DWORD hint = request.random ? FILE_FLAG_RANDOM_ACCESS : FILE_FLAG_SEQUENTIAL_SCAN;
    const DWORD fate = request.temporary ? FILE_FLAG_DELETE_ON_CLOSE | FILE_ATTRIBUTE_TEMPORARY : 0;
    HANDLE handle = CreateFileW(path, access, share, nullptr, CreationOf(request.disposition), hint | fate, nullptr);
    if (handle == INVALID_HANDLE_VALUE)
        return GetLastError() == ERROR_PATH_NOT_FOUND ? OpenResult::PathNotFound : OpenResult::Failed;
    file = reinterpret_cast<FileHandle>(handle);
    return OpenResult::Opened;
}

void CloseFile(FileHandle file) noexcept { CloseHandle(SystemHandle(file)); }

bool GetFileLength(FileHandle file, std::uint64_t& length) noexcept {
    LARGE_INTEGER size;
    if (!GetFileSizeEx(SystemHandle(file), &size)) return false;
    length = static_cast<std::uint64_t>(size.QuadPart);
    return true;
}

bool MoveFilePosition(FileHandle file, std::int64_t distance, Origin origin, std::uint64_t* position) noexcept {
    LARGE_INTEGER move, result;
    move.QuadPart = distance;
    if (!SetFilePointerEx(SystemHandle(file), move, &result, origin == Origin::Start ? FILE_BEGIN : FILE_CURRENT))
        return false;
    if (position) *position = static_cast<std::uint64_t>(result.QuadPart);
    return true;
}

bool EndFileAtPosition(FileHandle file) noexcept { return SetEndOfFile(SystemHandle(file)); }

bool FlushFile(FileHandle file) noexcept { return FlushFileBuffers(SystemHandle(file)); }

bool ReadFromFile(FileHandle file, void* buffer, std::uint32_t size, std::uint32_t& done) noexcept {
    DWORD count = 0;
    const bool ok = ReadFile(SystemHandle(file), buffer, size, &count, nullptr);
    done = ok ? count : 0;
    return ok;
}

bool WriteToFile(FileHandle file, const void* buffer, std::uint32_t size, std::uint32_t& done) noexcept {
    DWORD count = 0;
    const bool ok = WriteFile(SystemHandle(file), buffer, size, &count, nullptr);
    done = ok ? count : 0;
    return ok;
}

PathKind GetPathKind(const wchar_t* path) noexcept {
    const DWORD attributes = GetFileAttributesW(path);
    if (attributes == INVALID_FILE_ATTRIBUTES) return PathKind::Missing;
    return attributes & FILE_ATTRIBUTE_DIRECTORY ? PathKind::Directory : PathKind::File;
}

bool RemoveFile(const wchar_t* path) noexcept { return ::DeleteFileW(path); }
bool RenameWithoutReplacing(const wchar_t* from, const wchar_t* to) noexcept { return MoveFileW(from, to); }
bool MakeDirectory(const wchar_t* path) noexcept { return CreateDirectoryW(path, nullptr); }

namespace {

struct Listing {
    HANDLE search; // null for a directory without entries
    WIN32_FIND_DATAW entry;
    bool pending; // the entry came with the search and was not given out yet
};

std::uint64_t Join(DWORD high, DWORD low) { return std::uint64_t{high} << 32 | low; }
std::uint64_t FileTime(const FILETIME& time) { return Join(time.dwHighDateTime, time.dwLowDateTime); }

bool IsDots(const wchar_t* name) { return name[0] == L'.' && (!name[1] || (name[1] == L'.' && !name[2])); }

// The pattern for all entries of a folder; null without memory. An empty path is the current folder.
wchar_t* AllEntriesOf(const wchar_t* path) {
    const auto length = static_cast<std::size_t>(lstrlenW(path));
    auto* pattern = static_cast<wchar_t*>(Allocate((length + 3) * sizeof(wchar_t)));
    if (!pattern) return nullptr;
    lstrcpyW(pattern, path);
    wchar_t* end = pattern + length;
    if (length > 0 && end[-1] != L'\\' && end[-1] != L'/' && end[-1] != L':') *end++ = L'\\';
    *end++ = L'*';
    *end = 0;
    return pattern;
}

bool StartSearch(Listing& listing, const wchar_t* path) {
    wchar_t* pattern = AllEntriesOf(path);
    if (!pattern) return false;
    listing.search = FindFirstFileW(pattern, &listing.entry);
    const DWORD error = GetLastError();
    Release(pattern);
    listing.pending = listing.search != INVALID_HANDLE_VALUE;
    if (listing.pending) return true;
    listing.search = nullptr;
    return error == ERROR_FILE_NOT_FOUND; // an empty folder without "." and "..", such as a drive's root
}

} // namespace

void* OpenDirectory(const wchar_t* path) noexcept {
    auto* listing = static_cast<Listing*>(Allocate(sizeof(Listing)));
    if (!listing || StartSearch(*listing, path)) return listing;
    Release(listing);
    return nullptr;
}

bool NextName(void* directory, wchar_t (&name)[kNameCapacity]) noexcept {
    auto& listing = *static_cast<Listing*>(directory);
    static_assert(sizeof name >= sizeof listing.entry.cFileName);
    while (listing.search) {
        if (!listing.pending && !FindNextFileW(listing.search, &listing.entry)) return false;
        listing.pending = false;
        if (IsDots(listing.entry.cFileName)) continue;
        lstrcpyW(name, listing.entry.cFileName);
        return true;
    }
    return false;
}

bool DescribeEntry(void* directory, EntryFacts& facts) noexcept {
    const auto& entry = static_cast<Listing*>(directory)->entry;
    facts.directory = entry.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY;
    facts.size = facts.directory ? 0 : Join(entry.nFileSizeHigh, entry.nFileSizeLow);
    facts.modified = FileTime(entry.ftLastWriteTime);
    facts.accessed = FileTime(entry.ftLastAccessTime);
    facts.created = FileTime(entry.ftCreationTime);
    facts.readOnly = entry.dwFileAttributes & FILE_ATTRIBUTE_READONLY;
    return true;
}

void CloseDirectory(void* directory) noexcept {
    const auto& listing = *static_cast<Listing*>(directory);
    if (listing.search) FindClose(listing.search);
    Release(directory);
}

} // namespace TAVO::Platform
