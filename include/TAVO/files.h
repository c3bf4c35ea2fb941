#pragma once
// Files, directories and the parts of paths.
//
// Paths are zero-terminated UTF-16; '/' and '\' both separate, on every platform. Where the system wants UTF-8, paths
// are converted with ordinary surrogate pairs, so every valid name can be opened; a name that contains '\' is out of
// reach there.
//
// Threads: functions may be called from any thread; one object is for one thread at a time.

#include <TAVO/config.h>
#include <TAVO/string.h>
#include <utility>

namespace TAVO {
namespace Files {

/// Kinds of root a path may have, in order of how much they pin down.
/// Absolute are drive, network and device, and on POSIX systems rooted.
enum ePathRoot : std::uint32_t {
    PathRootNone = 0,          ///< a relative path
    PathRootRooted = 1,        ///< "\": the current drive's root
    PathRootDriveRelative = 2, ///< "C:": the current folder of a drive
    PathRootDrive = 3,         ///< "C:\"
    PathRootNetwork = 4,       ///< "\\server\share\", the last separator optional
    PathRootDevice = 5         ///< "\\?\" or "\\.\", and a drive or "UNC\server\share\" that follows
};

/// The four parts of a path inside the caller's text; lengths in units. Joined in this order they are the text again.
/// A part that is missing has length 0; its pointer may be null.
struct tagPATHPARSEINFO {
    const wchar_t* pRoot = nullptr;
    std::size_t nRoot = 0;
    const wchar_t* pFolder = nullptr; ///< up to and including the last separator
    std::size_t nFolder = 0;
    const wchar_t* pStem = nullptr; ///< the name without its extension; "." and ".." are stems
    std::size_t nStem = 0;
    const wchar_t* pExtension = nullptr; ///< with its dot; ".profile" has none, that of "a." is "."
    std::size_t nExtension = 0;
    ePathRoot eRoot = PathRootNone;
};

/// The same parts as texts of their own. A missing part is null or empty.
struct tagCPATHPARSEINFO {
    String::CACFWChar sRoot;
    String::CACFWChar sFolder;
    String::CACFWChar sStem;
    String::CACFWChar sExtension;
    ePathRoot eRoot = PathRootNone;
};

/// Takes @p path apart; looks at the text only. The parts point into @p path.
/// @return false, with an empty record, for a null or empty path.
TAVO_API bool FU_ParsePath(const wchar_t* path, tagPATHPARSEINFO& info) noexcept;
/// The same into texts of their own; @p path may be one of them. False, with an empty record, also without memory.
TAVO_API bool FU_ParsePath(const wchar_t* path, tagCPATHPARSEINFO& info) noexcept;

/// Joins the parts. A folder that lacks its last separator gets one before a name: the first one used in the root or
/// the folder, else '/'. An extension without a dot gets one.
/// @return the path; a null text without memory.
TAVO_API String::CACFWChar FU_FormatPath(const tagPATHPARSEINFO& info) noexcept;
TAVO_API String::CACFWChar FU_FormatPath(const tagCPATHPARSEINFO& info) noexcept;

/// Creates the folder that the whole of @p path names, and every folder above it that is missing. Nothing is undone.
/// @return true when the folder exists at the end, whoever made it. False for null or empty, or with a file in the way.
TAVO_API bool FU_CreatePath(const wchar_t* path) noexcept;

/// The check to make before a path from outside is joined to a folder; demand PathRootNone then too.
/// @return true for a text that leads straight down: not empty, no "." or ".." component, no empty component after the
///         root (one separator at the end is fine), no control character, none of * ? " < > |, no ':' after the root,
///         no component that ends in a dot or a blank (Windows drops those).
TAVO_API bool FU_IsStraightPath(const wchar_t* path) noexcept;

namespace OS {

/// How a file is opened; combine with |.
enum eFileAccess : std::uint32_t {
    FileAccessRead = 0x0,       ///< reading only
    FileAccessWrite = 0x1,      ///< reading and writing
    FileAccessRandom = 0x2,     ///< hint: positions jump; without it they go forward
    FileAccessShareWrite = 0x4, ///< others may open it for writing
    FileAccessShareRead = 0x8   ///< others may open it for reading
};

/// What opening does to the file; combine with |.
enum eOpenFileOptions : std::uint32_t {
    OpenFileExisting = 0x0,   ///< the file must exist
    OpenFileCreate = 0x1,     ///< create it when it is missing; needs FileAccessWrite
    OpenFileCreateHint = 0x2, ///< allowed with OpenFileCreate only, and then changes nothing
    OpenFileTruncate = 0x4,   ///< start empty; needs FileAccessWrite
    OpenFileTemporary = 0x8   ///< delete the file when it is closed; needs OpenFileCreate, FileAccessWrite, no sharing
};

constexpr eFileAccess operator|(eFileAccess a, eFileAccess b) noexcept {
    return static_cast<eFileAccess>(static_cast<std::uint32_t>(a) | static_cast<std::uint32_t>(b));
}
constexpr eOpenFileOptions operator|(eOpenFileOptions a, eOpenFileOptions b) noexcept {
    return static_cast<eOpenFileOptions>(static_cast<std::uint32_t>(a) | static_cast<std::uint32_t>(b));
}

/// An open file, or none. Unbuffered: every call goes to the system. Cannot be copied.
/// Operations on a closed file fail. Failed operations change nothing.
class TAVO_API CFile {
public:
    CFile() noexcept = default;
    CFile(const CFile&) = delete;
    CFile& operator=(const CFile&) = delete;
    CFile(CFile&& other) noexcept
        : m_handle(std::exchange(other.m_handle, kClosed)), m_access(std::exchange(other.m_access, FileAccessRead)) {}
    CFile& operator=(CFile&& other) noexcept;
    /// Closes.
    ~CFile() { Close(); }

    /// Opens @p path. Sharing follows Windows: an open fails while what it wants is denied by another open file, or
    /// what it denies is used by one. On POSIX systems that holds among users of this library. When the path was not
    /// found, its last folder is created (only that one) and the open is tried again. This is so for every open, also
    /// one that only reads: it then fails and leaves an empty folder behind.
    /// @return false for a null or empty path, while a file is open, for combinations that the flags exclude, and when
    ///         the system refuses.
    bool Open(const wchar_t* path, eFileAccess access, eOpenFileOptions options) noexcept;
    /// Closes the file, if one is open; a temporary one is deleted. Always true.
    bool Close() noexcept;

    /// Bytes in the file; all-ones on failure.
    std::size_t GetSize() const noexcept;
    /// Writes what the system still holds back to the disk; only for files opened for writing.
    bool Flush() noexcept;
    /// Sets the position in bytes from the start; it may lie beyond the end. False from 2^63 on.
    bool SetPointer(std::size_t position) noexcept;
    /// Moves the position; false, without moving, for a place before the start.
    bool MovePointer(long long distance) noexcept;
    /// The position in bytes; all-ones on failure.
    std::size_t GetPointer() const noexcept;
    /// Ends the file at the position: cuts it, or extends it with zeros. Needs FileAccessWrite.
    bool SetEOF() noexcept;
    /// Reads up to @p n bytes at the position and moves it. At the end of the file it is true with 0 bytes.
    /// @param done  gets the bytes read, fewer than @p n at the end; 0 on failure; may be null
    bool Read(void* buffer, ulong32 n, ulong32* done) noexcept;
    /// Writes up to @p n bytes at the position and moves it.
    /// @param done  gets the bytes written, fewer than @p n on a full disk; 0 on failure; may be null
    bool Write(const void* buffer, ulong32 n, ulong32* done) noexcept;

    /// Deletes a file; false for a directory. On Windows also false for a read-only file or one that is open; POSIX
    /// systems delete those.
    static bool DeleteFileW(const wchar_t* path) noexcept;
    /// Renames or moves a file or directory; false when @p to exists, whatever it is.
    static bool RenameFile(const wchar_t* from, const wchar_t* to) noexcept;

private:
    static constexpr std::intptr_t kClosed = -1;

    std::intptr_t m_handle = kClosed;      // the platform's
    eFileAccess m_access = FileAccessRead; // as opened
};

/// Whether @p path names something that is not a directory. Null and empty are false.
TAVO_API bool _TestFileExists(const wchar_t* path) noexcept;
/// Deletes a file, as CFile::DeleteFileW.
TAVO_API bool _DeleteFile(const wchar_t* path) noexcept;
/// Whether @p path names a directory. Null and empty are false.
TAVO_API bool _TestDirExists(const wchar_t* path) noexcept;
/// Creates one directory; false when it exists or its parent does not.
TAVO_API bool _CreateDir(const wchar_t* path) noexcept;

/// One entry of a directory, as it was when the enumeration came by. A plain value.
class TAVO_API CFindData {
public:
    /// The name without the folder; empty before the first GetNext. Valid while this record lives and is not reused.
    const wchar_t* GetFilename() const noexcept { return m_name; }
    /// Bytes; 0 for a directory.
    std::size_t GetSize() const noexcept { return m_size; }
    bool isDirectory() const noexcept { return m_directory; }
    /// Windows: the attribute. POSIX: nobody has the permission to write.
    bool isReadOnly() const noexcept { return m_readOnly; }
    /// Times in units of 100 ns since 1601-01-01 00:00 UTC; 0 where the system does not know.
    unsigned long long GetLastModified() const noexcept { return m_modified; }
    unsigned long long GetLastAccessed() const noexcept { return m_accessed; }
    unsigned long long GetCreated() const noexcept { return m_created; }

private:
    friend class CDirectoryEnumerator;

    wchar_t m_name[260] = {};
    std::size_t m_size = 0;
    unsigned long long m_modified = 0;
    unsigned long long m_accessed = 0;
    unsigned long long m_created = 0;
    bool m_directory = false;
    bool m_readOnly = false;
};

/// Lists a directory one entry at a time, in the file system's order. "." and ".." never appear. Cannot be copied.
class TAVO_API CDirectoryEnumerator {
public:
    CDirectoryEnumerator() noexcept = default;
    CDirectoryEnumerator(const CDirectoryEnumerator&) = delete;
    CDirectoryEnumerator& operator=(const CDirectoryEnumerator&) = delete;
    ~CDirectoryEnumerator() { EndEnumerate(); }

    /// Starts over; an enumeration under way ends.
    /// @param dir          null or empty: the current directory; a separator at its end is optional
    /// @param pattern      '*' any run, '?' one character (a surrogate pair is one), the rest literally, A to Z without
    ///                     regard to case; null, empty, "*" and "*.*" match everything
    /// @param directories  false: files only
    /// @return whether the directory can be read, also when nothing matches.
    bool BeginEnumerate(const wchar_t* dir, const wchar_t* pattern, bool directories) noexcept;
    /// Fills @p data with the next match; false after the last, @p data then stays as it was.
    bool GetNext(CFindData& data) noexcept;
    /// Lets go of the directory; harmless without an enumeration.
    void EndEnumerate() noexcept;

private:
    void* m_search = nullptr;     // the platform's
    wchar_t* m_pattern = nullptr; // null: everything
    bool m_directories = false;
};

} // namespace OS
} // namespace Files
} // namespace TAVO
