// File access and directory enumeration; the calls of the system stand in platform/files_*.cpp.

#include "platform/files.h"
#include "platform/heap.h"

#include <cstring>
#include <TAVO/files.h>

namespace TAVO::Files::OS {

namespace {

using Platform::Disposition;

// A copy of the first `length` units, terminated; null without memory.
wchar_t* CopyText(const wchar_t* text, std::size_t length) {
    auto* copy = static_cast<wchar_t*>(Platform::Allocate((length + 1) * sizeof(wchar_t)));
    if (!copy) return nullptr;
    std::memcpy(copy, text, length * sizeof(wchar_t));
    copy[length] = 0;
    return copy;
}

bool HasText(const wchar_t* text) { return text && *text; }

// Fills the request from the flags; false for combinations that exclude each other.
bool MakeRequest(eFileAccess access, eOpenFileOptions options, Platform::FileRequest& request) {
    const bool create = options & OpenFileCreate;
    const bool truncate = options & OpenFileTruncate;
    request.write = access & FileAccessWrite;
    request.random = access & FileAccessRandom;
    request.shareRead = access & FileAccessShareRead;
    request.shareWrite = access & FileAccessShareWrite;
    request.temporary = options & OpenFileTemporary;
    if (request.temporary && (!create || request.shareRead || request.shareWrite)) return false;
    if ((options & OpenFileCreateHint) && !create) return false;
    if ((create || truncate) && !request.write) return false;
    constexpr Disposition kDispositions[2][2] = {{Disposition::OpenExisting, Disposition::TruncateExisting},
                                                 {Disposition::OpenAlways, Disposition::CreateAlways}};
    request.disposition = kDispositions[create][truncate];
    return true;
}

// Creates the folder that holds `path`, that one only.
bool MakeParent(const wchar_t* path) {
    const wchar_t* separator = nullptr;
    for (const wchar_t* unit = path; *unit; ++unit)
        if (String::_isSlash(*unit)) separator = unit;
    if (!separator || separator == path) return false;
    wchar_t* parent = CopyText(path, static_cast<std::size_t>(separator - path));
    if (!parent) return false;
    const bool made = Platform::MakeDirectory(parent);
    Platform::Release(parent);
    return made;
}

void Report(ulong32* target, std::uint32_t count) {
    if (target) *target = count;
}

} // namespace

// --- CFile ----------------------------------------------------------------------------------------------------------

CFile& CFile::operator=(CFile&& other) noexcept {
    if (this == &other) return *this;
    Close();
    m_handle = std::exchange(other.m_handle, kClosed);
    m_access = std::exchange(other.m_access, FileAccessRead);
    return *this;
}

bool CFile::Open(const wchar_t* path, eFileAccess access, eOpenFileOptions options) noexcept {
    static_assert(kClosed == Platform::kNoFile);
    Platform::FileRequest request;
    if (!HasText(path) || m_handle != kClosed || !MakeRequest(access, options, request)) return false;
    auto result = Platform::OpenFile(path, request, m_handle);
    // Intended (open-makes-folder): also an open that only reads creates the missing folder, although it cannot succeed
    // then. Callers that write next to what they looked for rely on the folder.
    if (result == Platform::OpenResult::PathNotFound && MakeParent(path))
        result = Platform::OpenFile(path, request, m_handle);
    if (result != Platform::OpenResult::Opened) return false;
    m_access = access;
    return true;
}

bool CFile::Close() noexcept {
    if (m_handle != kClosed) Platform::CloseFile(std::exchange(m_handle, kClosed));
    m_access = FileAccessRead;
    return true;
}

std::size_t CFile::GetSize() const noexcept {
    std::uint64_t size;
    return m_handle != kClosed && Platform::GetFileLength(m_handle, size) ? size : ~std::size_t{0};
}

bool CFile::Flush() noexcept {
    return m_handle != kClosed && (m_access & FileAccessWrite) && Platform::FlushFile(m_handle);
}

bool CFile::SetPointer(std::size_t position) noexcept {
    if (m_handle == kClosed || position > static_cast<std::size_t>(INT64_MAX)) return false;
    return Platform::MoveFilePosition(m_handle, static_cast<std::int64_t>(position), Platform::Origin::Start, nullptr);
}

bool CFile::MovePointer(long long distance) noexcept {
    return m_handle != kClosed && Platform::MoveFilePosition(m_handle, distance, Platform::Origin::Position, nullptr);
}

std::size_t CFile::GetPointer() const noexcept {
    std::uint64_t position;
    const bool known =
        m_handle != kClosed && Platform::MoveFilePosition(m_handle, 0, Platform::Origin::Position, &position);
    return known ? position : ~std::size_t{0};
}

bool CFile::SetEOF() noexcept { return m_handle != kClosed && Platform::EndFileAtPosition(m_handle); }

bool CFile::Read(void* buffer, ulong32 n, ulong32* done) noexcept {
    std::uint32_t count = 0;
    const bool ok = m_handle != kClosed && Platform::ReadFromFile(m_handle, buffer, n, count);
    Report(done, count);
    return ok;
}

bool CFile::Write(const void* buffer, ulong32 n, ulong32* done) noexcept {
    std::uint32_t count = 0;
    const bool ok = m_handle != kClosed && Platform::WriteToFile(m_handle, buffer, n, count);
    Report(done, count);
    return ok;
}

bool CFile::DeleteFileW(const wchar_t* path) noexcept { return HasText(path) && Platform::RemoveFile(path); }

// Intended (rename-keeps): a file that exists is never replaced, where a POSIX textbook would.
bool CFile::RenameFile(const wchar_t* from, const wchar_t* to) noexcept {
    return HasText(from) && HasText(to) && Platform::RenameWithoutReplacing(from, to);
}

// --- tests and actions ----------------------------------------------------------------------------------------------

bool _TestFileExists(const wchar_t* path) noexcept {
    return HasText(path) && Platform::GetPathKind(path) == Platform::PathKind::File;
}

bool _DeleteFile(const wchar_t* path) noexcept { return CFile::DeleteFileW(path); }

bool _TestDirExists(const wchar_t* path) noexcept {
    return HasText(path) && Platform::GetPathKind(path) == Platform::PathKind::Directory;
}

bool _CreateDir(const wchar_t* path) noexcept { return HasText(path) && Platform::MakeDirectory(path); }

// --- enumeration ----------------------------------------------------------------------------------------------------

namespace {

bool IsHighSurrogate(wchar_t c) { return (c & 0xFC00) == 0xD800; }
bool IsLowSurrogate(wchar_t c) { return (c & 0xFC00) == 0xDC00; }

// Units of the character that starts here.
int CharacterLength(const wchar_t* text) { return IsHighSurrogate(text[0]) && IsLowSurrogate(text[1]) ? 2 : 1; }

bool IsAnything(const wchar_t* pattern) {
    return !HasText(pattern) || String::wcscmpi(pattern, L"*") == 0 || String::wcscmpi(pattern, L"*.*") == 0;
}

// '*' is any run, '?' one character. On a mismatch only the last '*' takes one character more: what earlier ones took
// need not change, because a later '*' makes up for it.
bool Matches(const wchar_t* name, const wchar_t* pattern) {
    const wchar_t* retryPattern = nullptr; // behind the last '*'
    const wchar_t* retryName = nullptr;
    while (*name) {
        if (*pattern == L'*') {
            retryPattern = ++pattern;
            retryName = name;
        } else if (*pattern == L'?') {
            name += CharacterLength(name);
            ++pattern;
        } else if (*pattern && String::wccmpi(*name, *pattern) == 0) {
            ++name;
            ++pattern;
        } else if (retryPattern) {
            retryName += CharacterLength(retryName);
            name = retryName;
            pattern = retryPattern;
        } else {
            return false;
        }
    }
    while (*pattern == L'*') ++pattern;
    return !*pattern;
}

} // namespace

bool CDirectoryEnumerator::BeginEnumerate(const wchar_t* dir, const wchar_t* pattern, bool directories) noexcept {
    EndEnumerate();
    if (!IsAnything(pattern)) {
        std::size_t length = 0;
        while (pattern[length]) ++length;
        m_pattern = CopyText(pattern, length);
        if (!m_pattern) return false;
    }
    m_directories = directories;
    m_search = Platform::OpenDirectory(dir ? dir : L"");
    if (!m_search) EndEnumerate();
    return m_search != nullptr;
}

bool CDirectoryEnumerator::GetNext(CFindData& data) noexcept {
    static_assert(sizeof data.m_name == Platform::kNameCapacity * sizeof(wchar_t));
    wchar_t name[Platform::kNameCapacity];
    Platform::EntryFacts facts;
    while (m_search && Platform::NextName(m_search, name)) {
        if (m_pattern && !Matches(name, m_pattern)) continue;
        if (!Platform::DescribeEntry(m_search, facts) || (facts.directory && !m_directories)) continue;
        std::memcpy(data.m_name, name, sizeof name);
        data.m_size = facts.size;
        data.m_modified = facts.modified;
        data.m_accessed = facts.accessed;
        data.m_created = facts.created;
        data.m_directory = facts.directory;
        data.m_readOnly = facts.readOnly;
        return true;
    }
    return false;
}

void CDirectoryEnumerator::EndEnumerate() noexcept {
    if (m_search) Platform::CloseDirectory(std::exchange(m_search, nullptr));
    Platform::Release(std::exchange(m_pattern, nullptr));
}

} // namespace TAVO::Files::OS
