// What only POSIX systems can show about files: other processes by fork, descriptors, names that are no text.

#include "support/log.h"
#include "support/scratch.h"
#include "support/sharing.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace TAVO::Files::OS;
using namespace support;
using File = FileTest;

unsigned support::KindsThatOpenElsewhere(const wchar_t* path) {
    const pid_t child = fork();
    if (child == 0) _exit(static_cast<int>(KindsThatOpen(path)));
    int status = 0;
    EXPECT_EQ(waitpid(child, &status, 0), child);
    return WIFEXITED(status) ? static_cast<unsigned>(WEXITSTATUS(status)) : ~0u;
}

TEST_F(File, IsNotAskedOfDevicesAndAForeignLockDoesNotHangAnOpen) {
    CFile second;
    EXPECT_TRUE(file.Open(L"/dev/null", FileAccessWrite, OpenFileExisting));
    EXPECT_TRUE(second.Open(L"/dev/null", FileAccessWrite, OpenFileTruncate) && second.Write("x", 1, nullptr));
    file.Close();
    Put(path, "x");
    const int foreign = open(Ascii(path).c_str(), O_RDONLY | O_CLOEXEC);
    ASSERT_EQ(flock(foreign, LOCK_EX), 0);
    EXPECT_FALSE(file.Open(path, FileAccessRead, OpenFileExisting));
    close(foreign);
    EXPECT_TRUE(file.Open(path, FileAccessRead, OpenFileExisting));
}

TEST_F(File, LosesNoDescriptorsAndHandsNoneOn) {
    Put(path, "x");
    const auto openDescriptors = [] { return List(L"/proc/self/fd").size(); };
    const auto before = openDescriptors();
    const int lowest = dup(STDERR_FILENO);
    close(lowest);
    {
        CFile first, second;
        ASSERT_TRUE(first.Open(path, FileAccessWrite, OpenFileExisting));
        EXPECT_EQ(fcntl(lowest, F_GETFD), FD_CLOEXEC);
        for (const WideText& refused : {path, folder.Path(), folder / L"missing"})
            EXPECT_FALSE(second.Open(refused, FileAccessRead, OpenFileExisting));
        CDirectoryEnumerator listing;
        for (int i = 0; i < 2; ++i) EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true));
        EXPECT_EQ(openDescriptors(), before + 2);
    }
    EXPECT_EQ(openDescriptors(), before);
}

TEST_F(File, ATemporaryOneGoesByTheNameItHasAtTheEnd) {
    for (const bool renamed : {true, false}) {
        _DeleteFile(path);
        ASSERT_TRUE(file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTemporary));
        EXPECT_TRUE(renamed ? CFile::RenameFile(path, folder / L"moved") : _DeleteFile(path));
        Put(path, "another file");
        file.Close();
        EXPECT_EQ(List(folder.Path()), std::vector<WideText>{L"file"}) << "not ours, so it stays";
    }
}

TEST_F(File, AReadFromAPipeTakesWhatIsThere) {
    int ends[2];
    ASSERT_TRUE(pipe2(ends, O_CLOEXEC) == 0 && write(ends[1], "abc", 3) == 3);
    char buffer[16];
    const WideText pipe = Widen("/proc/self/fd/" + std::to_string(ends[0]));
    ASSERT_TRUE(file.Open(pipe, FileAccessRead, OpenFileExisting));
    EXPECT_TRUE(file.Read(buffer, sizeof buffer, &done) && done == 3) << "and does not wait for more";
    EXPECT_TRUE(!file.SetPointer(0) && file.GetPointer() == ~std::size_t{0});
    for (const int end : ends) close(end);
}

TEST_F(File, ListedWithNamesThatAreNoTextAndWhatLinksLeadTo) {
    const std::string here = Ascii(folder.Path());
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    for (const char* target : {"dir", "nowhere"}) ASSERT_EQ(symlink(target, (here + "/to_" + target).c_str()), 0);
    EXPECT_EQ(List(folder.Path(), nullptr, false), std::vector<WideText>{L"to_nowhere"});
    EXPECT_EQ(List(folder.Path(), nullptr, true).size(), 3u);
    EXPECT_FALSE(_TestFileExists(folder / L"to_nowhere"));

    const int descriptor = open((here + "/a\xFF" + "b").c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0444);
    if (descriptor < 0) GTEST_SKIP() << "the file system refuses such names";
    close(descriptor);
    CDirectoryEnumerator listing;
    CFindData entry;
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"a?b", true) && listing.GetNext(entry));
    EXPECT_EQ(WideText(entry.GetFilename()), WideText(L"a\uFFFD") + L"b");
    EXPECT_TRUE(entry.isReadOnly()) << "nobody may write";
    EXPECT_FALSE(_TestFileExists(folder / entry.GetFilename()));
}
