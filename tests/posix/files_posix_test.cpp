// What only POSIX systems can show about files: other processes by fork, descriptors, names that are no text.

#include "support/scratch.h"
#include "support/sharing.h"

#include <chrono>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace TAVO::Files::OS;
using support::Put;
using support::WideText;

namespace {

#if defined(__SANITIZE_THREAD__)
constexpr bool kThreadsAreChecked = true;
#else
constexpr bool kThreadsAreChecked = false;
#endif

using FileOpen = support::FileTest;
using FileSharing = support::FileTest;
using File = support::FileTest;
using FileActions = support::FileTest;
using Enumeration = support::FileTest;

// For the ASCII paths of these tests.
std::string Narrow(const WideText& text) {
    std::string result;
    for (const wchar_t* c = text; *c; ++c) result += static_cast<char>(*c);
    return result;
}

std::size_t OpenDescriptors() { return support::List(L"/proc/self/fd").size(); }

} // namespace

unsigned support::KindsThatOpenElsewhere(const wchar_t* path) {
    const pid_t child = fork();
    if (child == 0) _exit(static_cast<int>(KindsThatOpen(path)));
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? static_cast<unsigned>(WEXITSTATUS(status)) : ~0u;
}

TEST_F(FileSharing, IsNotAskedOfDevicesAndPipes) {
    CFile second;
    EXPECT_TRUE(file.Open(L"/dev/null", FileAccessWrite, OpenFileExisting));
    EXPECT_TRUE(second.Open(L"/dev/null", FileAccessWrite, OpenFileTruncate));
    EXPECT_TRUE(second.Write("x", 1, nullptr));
}

TEST_F(FileSharing, AForeignLockDoesNotHangAnOpen) {
    Put(path, "x");
    const int foreign = open(Narrow(path).c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(foreign, LOCK_EX), 0);
    const auto start = std::chrono::steady_clock::now();
    EXPECT_FALSE(file.Open(path, FileAccessRead, OpenFileExisting));
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(100));
    close(foreign);
    EXPECT_TRUE(file.Open(path, FileAccessRead, OpenFileExisting));
}

TEST_F(FileOpen, LosesNoDescriptorsAndHandsNoneOn) {
    Put(path, "x");
    const auto before = OpenDescriptors();
    const int lowest = dup(STDERR_FILENO);
    close(lowest);
    {
        CFile second;
        ASSERT_TRUE(file.Open(path, FileAccessWrite, OpenFileExisting));
        EXPECT_EQ(fcntl(lowest, F_GETFD), FD_CLOEXEC);
        EXPECT_FALSE(second.Open(path, FileAccessRead, OpenFileExisting));
        EXPECT_FALSE(second.Open(folder.Path(), FileAccessRead, OpenFileExisting));
        EXPECT_FALSE(second.Open(folder / L"missing", FileAccessRead, OpenFileExisting));
        CDirectoryEnumerator listing;
        EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true));
        EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true));
        EXPECT_EQ(OpenDescriptors(), before + 2);
    }
    file.Close();
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST_F(File, ATemporaryOneGoesByTheNameItHasAtTheEnd) {
    const WideText moved = folder / L"moved";
    const auto open = [&] { return file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTemporary); };
    ASSERT_TRUE(open() && CFile::RenameFile(path, moved));
    Put(path, "another file");
    file.Close();
    EXPECT_FALSE(_TestFileExists(moved));
    EXPECT_TRUE(_TestFileExists(path)) << "not ours, so it stays";

    ASSERT_TRUE(_DeleteFile(path) && open() && _DeleteFile(path));
    Put(path, "another file");
    file.Close();
    EXPECT_TRUE(_TestFileExists(path));
}

TEST_F(File, MovesMoreThanTwoGiBInOneCall) {
    if (kThreadsAreChecked) GTEST_SKIP() << "the checker keeps notes about every byte";
    // One small piece of memory mapped again and again, and a device that takes and gives any number of bytes.
    constexpr std::size_t kPiece = std::size_t{1} << 26, kSize = (std::size_t{1} << 31) + kPiece;
    const int memory = memfd_create("piece", MFD_CLOEXEC);
    ASSERT_EQ(ftruncate(memory, kPiece), 0);
    void* room = mmap(nullptr, kSize, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    for (char* at = static_cast<char*>(room); at < static_cast<char*>(room) + kSize; at += kPiece)
        ASSERT_EQ(mmap(at, kPiece, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_FIXED, memory, 0), at);
    ASSERT_TRUE(file.Open(L"/dev/zero", FileAccessWrite, OpenFileExisting));
    EXPECT_TRUE(file.Write(room, kSize, &done));
    EXPECT_EQ(std::exchange(done, 7), kSize);
    EXPECT_TRUE(file.Read(room, kSize, &done));
    EXPECT_EQ(done, kSize);
    munmap(room, kSize);
    close(memory);
}

TEST_F(File, AReadFromAPipeTakesWhatIsThere) {
    int ends[2];
    ASSERT_EQ(pipe2(ends, O_CLOEXEC), 0);
    ASSERT_EQ(write(ends[1], "abc", 3), 3);
    char buffer[16];
    const WideText pipe = support::Widen("/proc/self/fd/" + std::to_string(ends[0]));
    ASSERT_TRUE(file.Open(pipe, FileAccessRead, OpenFileExisting));
    EXPECT_TRUE(file.Read(buffer, sizeof buffer, &done)) << "and does not wait for more";
    EXPECT_EQ(done, 3u);
    EXPECT_FALSE(file.SetPointer(0));
    EXPECT_EQ(file.GetPointer(), ~std::size_t{0});
    close(ends[0]);
    close(ends[1]);
}

TEST_F(FileActions, RefuseNamesThatAreTooLong) {
    WideText name = L"x";
    for (int i = 0; i < 30; ++i) name = name + L"/" + support::Widen(std::string(200, 'x'));
    EXPECT_FALSE(file.Open(name, FileAccessWrite, OpenFileCreate));
    EXPECT_FALSE(_TestFileExists(name) || _TestDirExists(name) || _CreateDir(name) || _DeleteFile(name));
    EXPECT_FALSE(CDirectoryEnumerator().BeginEnumerate(name, nullptr, true));
}

TEST_F(Enumeration, ShowsNamesThatAreNoText) {
    const std::string name = Narrow(folder.Path()) + "/a\xFF" + "b";
    const int descriptor = open(name.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0444);
    if (descriptor < 0) GTEST_SKIP() << "the file system refuses such names";
    close(descriptor);
    CDirectoryEnumerator listing;
    CFindData entry;
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"a?b", true) && listing.GetNext(entry));
    EXPECT_EQ(WideText(entry.GetFilename()), WideText(L"a\uFFFD") + L"b");
    EXPECT_TRUE(entry.isReadOnly()) << "nobody may write";
    EXPECT_FALSE(_TestFileExists(folder / entry.GetFilename()));
}

TEST_F(Enumeration, LinksStandForWhatTheyLeadTo) {
    const std::string base = Narrow(folder.Path());
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    ASSERT_EQ(symlink("dir", (base + "/link").c_str()), 0);
    ASSERT_EQ(symlink("nowhere", (base + "/dangling").c_str()), 0);
    EXPECT_EQ(support::List(folder.Path(), nullptr, false), std::vector<WideText>{L"dangling"});
    EXPECT_EQ(support::List(folder.Path(), nullptr, true).size(), 3u);
    EXPECT_FALSE(_TestFileExists(folder / L"dangling"));
}
