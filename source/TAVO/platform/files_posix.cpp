// Files of POSIX systems (Linux): system calls, and the sharing rules of Windows among users of this library.

#include "files.h"

#include "heap.h"
#include "platform.h"

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <initializer_list>
#include <sys/file.h>
#include <sys/stat.h>
#include <time.h>
#include <unistd.h>

namespace TAVO::Platform {

namespace {

// Repeats a call for as long as signals interrupt it.
template <class Call> auto Uninterrupted(Call call) {
    for (;;) {
        const auto result = call();
        if (result != -1 || errno != EINTR) return result;
    }
}

// A path as the system wants it. One that is too long or no text becomes "", which no call accepts.
class NativePath {
public:
    explicit NativePath(const wchar_t* path) {
        if (WideToAnsi(path, -1, m_text, sizeof m_text) <= 0) m_text[0] = 0;
        for (char* c = m_text; *c; ++c)
            if (*c == '\\') *c = '/';
    }
    operator const char*() const { return m_text; }

    // Whether the folder that should hold the last component is missing.
    bool LacksParent() const {
        const char* separator = std::strrchr(m_text, '/');
        if (!separator || separator == m_text) return false;
        char parent[PATH_MAX];
        const auto length = static_cast<std::size_t>(separator - m_text);
        std::memcpy(parent, m_text, length);
        parent[length] = 0;
        struct stat facts;
        return stat(parent, &facts) != 0 && (errno == ENOENT || errno == ENOTDIR);
    }

private:
    char m_text[PATH_MAX];
};

// A handle is the descriptor, with a mark above it for files that are deleted when they are closed.
constexpr FileHandle kTemporary = FileHandle{1} << 32;

FileHandle MakeHandle(int descriptor, bool temporary) { return descriptor | (temporary ? kTemporary : 0); }
int DescriptorOf(FileHandle file) { return static_cast<int>(file & 0x7FFFFFFF); }
bool IsTemporary(FileHandle file) { return (file & kTemporary) != 0; }

class Descriptor {
public:
    explicit Descriptor(int descriptor) : m_descriptor(descriptor) {}
    Descriptor(const Descriptor&) = delete;
    ~Descriptor() {
        if (m_descriptor >= 0) close(m_descriptor);
    }
    int Get() const { return m_descriptor; }
    bool IsValid() const { return m_descriptor >= 0; }
    int Detach() {
        const int descriptor = m_descriptor;
        m_descriptor = -1;
        return descriptor;
    }

private:
    int m_descriptor;
};

// --- sharing --------------------------------------------------------------------------------------------------------
//
// Every open file holds shared locks on those of four far bytes that say what it does and what it denies others. An
// open is refused when another open file holds the opposite of what it is going to hold; locks of one open file never
// meet each other. Testing and taking is one step for all users, because it happens under an exclusive whole-file lock
// of the other kind (flock), which is held for that moment only. Closing the descriptor lets go of everything.

enum Claim : int { Reads, Writes, DeniesReading, DeniesWriting };
constexpr int Opposite(int claim) { return claim ^ 2; }
static_assert(Opposite(Reads) == DeniesReading && Opposite(Writes) == DeniesWriting);

constexpr off_t kFirstClaim = 0x7FFFFFFFFFFFFF00;
constexpr int kGatePatience = 100; // milliseconds; a foreign lock must not hang an open

struct flock ClaimLock(int claim, short type) {
    struct flock lock = {};
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    lock.l_start = kFirstClaim + claim;
    lock.l_len = 1;
    return lock;
}

enum class Answer { Yes, No, Unsupported };

Answer EnterGate(int descriptor) {
    for (int waited = 0;; ++waited) {
        if (flock(descriptor, LOCK_EX | LOCK_NB) == 0) return Answer::Yes;
        if (errno != EWOULDBLOCK) return Answer::Unsupported;
        if (waited == kGatePatience) return Answer::No;
        const timespec pause = {0, 1000000};
        nanosleep(&pause, nullptr);
    }
}

// Whether nobody else holds the opposite of `claim`.
Answer IsFree(int descriptor, int claim) {
    struct flock lock = ClaimLock(Opposite(claim), F_WRLCK);
    if (fcntl(descriptor, F_OFD_GETLK, &lock) != 0) return Answer::Unsupported;
    return lock.l_type == F_UNLCK ? Answer::Yes : Answer::No;
}

Answer Take(int descriptor, int claim) {
    struct flock lock = ClaimLock(claim, F_RDLCK);
    return fcntl(descriptor, F_OFD_SETLK, &lock) == 0 ? Answer::Yes : Answer::Unsupported;
}

Answer TakeClaims(int descriptor, const FileRequest& request) {
    const bool wanted[] = {true, request.write, !request.shareRead, !request.shareWrite};
    for (const auto step : {IsFree, Take})
        for (int claim = Reads; claim <= DeniesWriting; ++claim) {
            if (!wanted[claim]) continue;
            if (const Answer answer = step(descriptor, claim); answer != Answer::Yes) return answer;
        }
    return Answer::Yes;
}

// False when another open file stands against the request. File systems without such locks enforce nothing.
bool Share(int descriptor, const FileRequest& request) {
    const Answer gate = EnterGate(descriptor);
    if (gate != Answer::Yes) return gate == Answer::Unsupported;
    const Answer answer = TakeClaims(descriptor, request);
    flock(descriptor, LOCK_UN);
    return answer != Answer::No;
}

// --- opening and closing --------------------------------------------------------------------------------------------

bool Creates(Disposition disposition) {
    return disposition == Disposition::OpenAlways || disposition == Disposition::CreateAlways;
}
bool Truncates(Disposition disposition) {
    return disposition == Disposition::TruncateExisting || disposition == Disposition::CreateAlways;
}

enum class Attempt { Done, Refused, Vanished };

// What remains once the descriptor is open. Truncating waits until here, so that a refused open changes nothing.
Attempt FinishOpen(int descriptor, const FileRequest& request) {
    struct stat facts;
    if (fstat(descriptor, &facts) != 0 || S_ISDIR(facts.st_mode)) return Attempt::Refused;
    if (!S_ISREG(facts.st_mode)) return Attempt::Done; // pipes and devices know neither sharing nor ends
    if (!Share(descriptor, request)) return Attempt::Refused;
    // The last user may have deleted the file between our open and our claims.
    if (fstat(descriptor, &facts) != 0) return Attempt::Refused;
    if (facts.st_nlink == 0) return Attempt::Vanished;
    if (Truncates(request.disposition) && Uninterrupted([&] { return ftruncate(descriptor, 0); }) != 0)
        return Attempt::Refused;
    posix_fadvise(descriptor, 0, 0, request.random ? POSIX_FADV_RANDOM : POSIX_FADV_SEQUENTIAL);
    return Attempt::Done;
}

bool IsSameFile(const struct stat& a, const struct stat& b) { return a.st_dev == b.st_dev && a.st_ino == b.st_ino; }

// Deletes the file behind the descriptor by the name it has now, which survives renaming and changes of the current
// directory. A name that meanwhile belongs to another file is left alone.
void RemoveByDescriptor(int descriptor) {
    char link[40];
    char path[PATH_MAX];
    std::snprintf(link, sizeof link, "/proc/self/fd/%d", descriptor);
    const ssize_t length = readlink(link, path, sizeof path - 1);
    if (length <= 0) return;
    path[length] = 0;
    struct stat ours, named;
    if (fstat(descriptor, &ours) == 0 && lstat(path, &named) == 0 && IsSameFile(ours, named)) unlink(path);
}

} // namespace

OpenResult OpenFile(const wchar_t* path, const FileRequest& request, FileHandle& file) noexcept {
    constexpr int kAttempts = 8; // against a file that others keep deleting
    const NativePath native(path);
    const int flags =
        (request.write ? O_RDWR : O_RDONLY) | (Creates(request.disposition) ? O_CREAT : 0) | O_CLOEXEC | O_NOCTTY;
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        Descriptor descriptor(Uninterrupted([&] { return open(native, flags, 0666); }));
        if (!descriptor.IsValid())
            return errno == ENOENT && native.LacksParent() ? OpenResult::PathNotFound : OpenResult::Failed;
        const Attempt result = FinishOpen(descriptor.Get(), request);
        if (result == Attempt::Refused) return OpenResult::Failed;
        if (result == Attempt::Vanished) continue;
        file = MakeHandle(descriptor.Detach(), request.temporary);
        return OpenResult::Opened;
    }
    return OpenResult::Failed;
}

void CloseFile(FileHandle file) noexcept {
    if (IsTemporary(file)) RemoveByDescriptor(DescriptorOf(file));
    close(DescriptorOf(file)); // also after EINTR the descriptor is gone
}

// --- transfer and position ------------------------------------------------------------------------------------------

bool GetFileLength(FileHandle file, std::uint64_t& length) noexcept {
    struct stat facts;
    if (fstat(DescriptorOf(file), &facts) != 0) return false;
    length = static_cast<std::uint64_t>(facts.st_size);
    return true;
}

bool MoveFilePosition(FileHandle file, std::int64_t distance, Origin origin, std::uint64_t* position) noexcept {
    const off_t result = lseek(DescriptorOf(file), distance, origin == Origin::Start ? SEEK_SET : SEEK_CUR);
    if (result < 0) return false;
    if (position) *position = static_cast<std::uint64_t>(result);
    return true;
}

bool EndFileAtPosition(FileHandle file) noexcept {
    std::uint64_t position;
    if (!MoveFilePosition(file, 0, Origin::Position, &position)) return false;
    return Uninterrupted([&] { return ftruncate(DescriptorOf(file), static_cast<off_t>(position)); }) == 0;
}

bool FlushFile(FileHandle file) noexcept {
    return Uninterrupted([&] { return fsync(DescriptorOf(file)); }) == 0;
}

// The system moves at most this much in one call; only then is a short count a reason to go on.
constexpr std::uint32_t kLargestTransfer = 0x7FFFF000;

bool ReadFromFile(FileHandle file, void* buffer, std::uint32_t size, std::uint32_t& done) noexcept {
    done = 0;
    for (;;) {
        const std::uint32_t part = size - done < kLargestTransfer ? size - done : kLargestTransfer;
        const ssize_t got =
            Uninterrupted([&] { return read(DescriptorOf(file), static_cast<char*>(buffer) + done, part); });
        if (got < 0) return done > 0;
        done += static_cast<std::uint32_t>(got);
        if (static_cast<std::uint32_t>(got) < kLargestTransfer || done == size) return true;
    }
}

bool WriteToFile(FileHandle file, const void* buffer, std::uint32_t size, std::uint32_t& done) noexcept {
    done = 0;
    do {
        const std::uint32_t part = size - done < kLargestTransfer ? size - done : kLargestTransfer;
        const ssize_t put =
            Uninterrupted([&] { return write(DescriptorOf(file), static_cast<const char*>(buffer) + done, part); });
        if (put < 0) return done > 0;
        done += static_cast<std::uint32_t>(put);
        if (put == 0) break;
    } while (done < size);
    return true;
}

// --- paths ----------------------------------------------------------------------------------------------------------

PathKind GetPathKind(const wchar_t* path) noexcept {
    struct stat facts;
    if (stat(NativePath(path), &facts) != 0) return PathKind::Missing;
    return S_ISDIR(facts.st_mode) ? PathKind::Directory : PathKind::File;
}

bool RemoveFile(const wchar_t* path) noexcept { return unlink(NativePath(path)) == 0; }

bool RenameWithoutReplacing(const wchar_t* from, const wchar_t* to) noexcept {
    const NativePath source(from);
    const NativePath target(to);
    if (renameat2(AT_FDCWD, source, AT_FDCWD, target, RENAME_NOREPLACE) == 0) return true;
    if (errno != EINVAL && errno != ENOSYS) return false;
    // A file system that cannot do it in one step: look first. A target that appears in between would be replaced.
    struct stat facts;
    if (lstat(target, &facts) == 0 || errno != ENOENT) return false;
    return rename(source, target) == 0;
}

bool MakeDirectory(const wchar_t* path) noexcept { return mkdir(NativePath(path), 0777) == 0; }

// --- directories ----------------------------------------------------------------------------------------------------

namespace {

struct Listing {
    DIR* stream;
    const char* name; // the entry that NextName gave last, inside the stream's buffer
};

// Units of 100 ns since 1601.
std::uint64_t FileTime(const statx_timestamp& time) {
    constexpr std::int64_t kSecondsFrom1601To1970 = 11644473600;
    const std::int64_t seconds = time.tv_sec + kSecondsFrom1601To1970;
    if (seconds < 0) return 0;
    return static_cast<std::uint64_t>(seconds) * 10000000 + time.tv_nsec / 100;
}

bool IsDots(const char* name) { return std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0; }

} // namespace

void* OpenDirectory(const wchar_t* path) noexcept {
    DIR* stream = *path ? opendir(NativePath(path)) : opendir(".");
    if (!stream) return nullptr;
    auto* listing = static_cast<Listing*>(Allocate(sizeof(Listing)));
    if (!listing) {
        closedir(stream);
        return nullptr;
    }
    *listing = {stream, nullptr};
    return listing;
}

bool NextName(void* directory, wchar_t (&name)[kNameCapacity]) noexcept {
    auto& listing = *static_cast<Listing*>(directory);
    while (const dirent* entry = readdir(listing.stream)) {
        if (IsDots(entry->d_name)) continue;
        listing.name = entry->d_name;
        if (AnsiToWide(entry->d_name, -1, name, kNameCapacity) > 0) return true;
    }
    return false;
}

bool DescribeEntry(void* directory, EntryFacts& facts) noexcept {
    const auto& listing = *static_cast<Listing*>(directory);
    const int folder = dirfd(listing.stream);
    constexpr unsigned kMask = STATX_BASIC_STATS | STATX_BTIME;
    struct statx found;
    // A link stands for what it leads to; one that leads nowhere, for itself.
    if (statx(folder, listing.name, 0, kMask, &found) != 0 &&
        statx(folder, listing.name, AT_SYMLINK_NOFOLLOW, kMask, &found) != 0)
        return false;
    facts.directory = S_ISDIR(found.stx_mode);
    facts.size = facts.directory ? 0 : found.stx_size;
    facts.modified = FileTime(found.stx_mtime);
    facts.accessed = FileTime(found.stx_atime);
    facts.created = found.stx_mask & STATX_BTIME ? FileTime(found.stx_btime) : 0;
    facts.readOnly = (found.stx_mode & 0222) == 0;
    return true;
}

void CloseDirectory(void* directory) noexcept {
    closedir(static_cast<Listing*>(directory)->stream);
    Release(directory);
}

} // namespace TAVO::Platform
