// What only POSIX systems can show about files: other processes by fork, descriptors, names that are no text.

#include "support/scratch.h"
#include "support/sharing.h"

#include <algorithm>
#include <chrono>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace TAVO::Files::OS;
using support::Put;
using support::ScratchFolder;
using support::WideText;
using TAVO::ulong32;

namespace {

#if defined(__SANITIZE_THREAD__)
constexpr bool kThreadsAreChecked = true;
#else
constexpr bool kThreadsAreChecked = false;
#endif

// For the ASCII paths of these tests.
std::string Narrow(const WideText& text) {
    std::string result;
    for (const wchar_t* c = text; *c; ++c) result += static_cast<char>(*c);
    return result;
}

// Runs `body` in a child process; its result, 0 to 255.
template <class Body> unsigned InChild(Body body) {
    const pid_t child = fork();
    if (child == 0) _exit(static_cast<int>(body()));
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    EXPECT_TRUE(WIFEXITED(status));
    return static_cast<unsigned>(WEXITSTATUS(status));
}

int OpenDescriptors() { return static_cast<int>(support::List(L"/proc/self/fd").size()); }

} // namespace

void support::RemoveEmptyFolder(const wchar_t* path) { rmdir(Narrow(path).c_str()); }

TEST(FileSharing, All64PairsAnswerInAnotherProcess) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    for (unsigned kind = 0; kind < support::kSharingKinds; ++kind) {
        CFile first;
        ASSERT_TRUE(support::OpenAsKind(first, path, kind)) << kind;
        EXPECT_EQ(InChild([&] { return support::KindsThatOpen(path); }), support::KindsThatMayMeet(kind)) << kind;
    }
}

TEST(FileSharing, IsNotAskedOfDevicesAndPipes) {
    CFile first, second;
    EXPECT_TRUE(first.Open(L"/dev/null", FileAccessWrite, OpenFileExisting));
    EXPECT_TRUE(second.Open(L"/dev/null", FileAccessWrite, OpenFileTruncate));
    EXPECT_TRUE(second.Write("x", 1, nullptr));
}

TEST(FileSharing, AForeignLockDoesNotHangAnOpen) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    const int foreign = open(Narrow(path).c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(foreign, LOCK_EX), 0);
    CFile file;
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(file.Open(path, FileAccessRead, OpenFileExisting));
    const auto taken = std::chrono::steady_clock::now() - start;
    EXPECT_GE(taken, std::chrono::milliseconds(100));
    close(foreign);
    EXPECT_TRUE(file.Open(path, FileAccessRead, OpenFileExisting));
}

TEST(FileOpen, LosesNoDescriptors) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    const int before = OpenDescriptors();
    {
        CFile first, second;
        ASSERT_TRUE(first.Open(path, FileAccessWrite, OpenFileExisting));
        EXPECT_FALSE(second.Open(path, FileAccessRead, OpenFileExisting));
        EXPECT_FALSE(second.Open(folder.Path(), FileAccessRead, OpenFileExisting));
        EXPECT_FALSE(second.Open(folder / L"missing", FileAccessRead, OpenFileExisting));
        CDirectoryEnumerator listing;
        EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true));
        EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true));
        EXPECT_EQ(OpenDescriptors(), before + 2);
    }
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(FileOpen, DescriptorsEndWithExec) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    CFile file;
    ASSERT_TRUE(file.Open(path, FileAccessWrite, OpenFileCreate));
    int found = 0;
    for (int descriptor = 0; descriptor < 1024; ++descriptor) {
        struct stat ours, named;
        if (fstat(descriptor, &ours) != 0 || stat(Narrow(path).c_str(), &named) != 0 || ours.st_ino != named.st_ino)
            continue;
        ++found;
        EXPECT_TRUE(fcntl(descriptor, F_GETFD) & FD_CLOEXEC);
    }
    EXPECT_EQ(found, 1);
}

TEST(TemporaryFiles, GoByTheNameTheyHaveAtTheEnd) {
    ScratchFolder folder;
    const WideText path = folder / L"file", moved = folder / L"moved";
    CFile file;
    const auto open = [&] { return file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTemporary); };
    ASSERT_TRUE(open());
    ASSERT_TRUE(CFile::RenameFile(path, moved));
    Put(path, "another file");
    file.Close();
    EXPECT_FALSE(_TestFileExists(moved));
    EXPECT_TRUE(_TestFileExists(path)) << "not ours, so it stays";

    ASSERT_TRUE(_DeleteFile(path) && open());
    ASSERT_TRUE(_DeleteFile(path));
    Put(path, "another file");
    file.Close();
    EXPECT_TRUE(_TestFileExists(path));
}

TEST(File, WritesMoreThanTwoGiBInOneCall) {
    if (kThreadsAreChecked) GTEST_SKIP() << "the checker keeps notes about every byte";
    constexpr std::size_t kSize = 0xFFFFFFFF;
    void* room = mmap(nullptr, kSize, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    ASSERT_NE(room, MAP_FAILED);
    CFile file;
    ulong32 done = 0;
    ASSERT_TRUE(file.Open(L"/dev/null", FileAccessWrite, OpenFileExisting));
    EXPECT_TRUE(file.Write(room, kSize, &done)) << "the device does not look at the bytes";
    EXPECT_EQ(done, kSize);
    munmap(room, kSize);
}

TEST(File, ReadsMoreThanTwoGiBInOneCall) {
    if (kThreadsAreChecked) GTEST_SKIP() << "the checker keeps notes about every byte";
    // The target is one small piece of memory mapped again and again, the source a file of nothing but a gap.
    constexpr std::size_t kPiece = std::size_t{1} << 26, kSize = (std::size_t{1} << 31) + kPiece;
    ScratchFolder folder;
    CFile file;
    ASSERT_TRUE(file.Open(folder / L"sparse", FileAccessWrite, OpenFileCreate));
    ASSERT_TRUE(file.SetPointer(kSize + 5) && file.SetEOF() && file.SetPointer(0));
    const int memory = memfd_create("piece", MFD_CLOEXEC);
    ASSERT_EQ(ftruncate(memory, kPiece), 0);
    void* room = mmap(nullptr, kSize, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    ASSERT_NE(room, MAP_FAILED);
    for (std::size_t at = 0; at < kSize; at += kPiece)
        ASSERT_NE(
            mmap(static_cast<char*>(room) + at, kPiece, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_FIXED, memory, 0),
            MAP_FAILED);
    ulong32 done = 0;
    EXPECT_TRUE(file.Read(room, kSize, &done));
    EXPECT_EQ(done, kSize);
    EXPECT_EQ(file.GetPointer(), kSize);
    EXPECT_TRUE(file.Read(room, kSize, &done));
    EXPECT_EQ(done, 5u);
    munmap(room, kSize);
    close(memory);
}

TEST(File, AReadFromAPipeTakesWhatIsThere) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    ASSERT_EQ(write(ends[1], "abc", 3), 3);
    CFile file;
    char buffer[16];
    ulong32 done = 0;
    ASSERT_TRUE(
        file.Open(support::Widen("/proc/self/fd/" + std::to_string(ends[0])), FileAccessRead, OpenFileExisting));
    EXPECT_TRUE(file.Read(buffer, sizeof buffer, &done)) << "and does not wait for more";
    EXPECT_EQ(done, 3u);
    EXPECT_FALSE(file.SetPointer(0));
    EXPECT_EQ(file.GetPointer(), ~std::size_t{0});
    close(ends[0]);
    close(ends[1]);
}

TEST(FileNames, TooLongAreRefused) {
    const WideText component = support::Widen("/" + std::string(200, 'x'));
    WideText path = L"x";
    for (int i = 0; i < 30; ++i) path = path + component;
    CFile file;
    EXPECT_FALSE(file.Open(path, FileAccessWrite, OpenFileCreate));
    EXPECT_FALSE(_TestFileExists(path) || _TestDirExists(path) || _CreateDir(path) || _DeleteFile(path));
    EXPECT_FALSE(CDirectoryEnumerator().BeginEnumerate(path, nullptr, true));
}

TEST(Enumeration, ShowsNamesThatAreNoText) {
    ScratchFolder folder;
    const std::string path = Narrow(folder.Path()) + "/a\xFF"
                                                     "b";
    const int descriptor = open(path.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0444);
    if (descriptor < 0) GTEST_SKIP() << "the file system refuses such names";
    close(descriptor);
    CDirectoryEnumerator listing;
    CFindData entry;
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"a?b", true) && listing.GetNext(entry));
    EXPECT_STREQ(entry.GetFilename(), L"a\uFFFD"
                                      L"b");
    EXPECT_TRUE(entry.isReadOnly()) << "nobody may write";
    EXPECT_FALSE(_TestFileExists(folder / entry.GetFilename()));
    unlink(path.c_str());
}

TEST(Enumeration, LinksStandForWhatTheyLeadTo) {
    ScratchFolder folder;
    const std::string base = Narrow(folder.Path());
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    ASSERT_EQ(symlink("dir", (base + "/link").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", (base + "/dangling").c_str()), 0);
    EXPECT_EQ(support::List(folder.Path(), nullptr, false), std::vector<WideText>{L"dangling"});
    EXPECT_EQ(support::List(folder.Path(), nullptr, true).size(), 3u);
    EXPECT_FALSE(_TestFileExists(folder / L"dangling"));
    unlink((base + "/link").c_str());
}
