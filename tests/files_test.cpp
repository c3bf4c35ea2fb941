// Files and directories.

#include "support/heapwatch.h"
#include "support/scratch.h"
#include "support/sharing.h"

#include <algorithm>
#include <climits>
#include <cstring>

using namespace TAVO::Files::OS;
using support::List;
using support::Put;
using support::ScratchFolder;
using support::WideText;
using TAVO::ulong32;

namespace {

constexpr std::size_t kNone = ~std::size_t{0};

std::string Contents(const wchar_t* path) {
    CFile file;
    if (!file.Open(path, FileAccessRead | FileAccessShareRead | FileAccessShareWrite, OpenFileExisting))
        return "(cannot open)";
    std::string bytes(file.GetSize(), 0);
    ulong32 done = 0;
    EXPECT_TRUE(file.Read(bytes.data(), static_cast<ulong32>(bytes.size()), &done));
    EXPECT_EQ(done, bytes.size());
    return bytes;
}

} // namespace

// Every combination of options, access, sharing and an existing or missing file, against the rules written out.
TEST(FileOpen, FollowsTheTableOfOptions) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    for (unsigned row = 0; row < 128; ++row) {
        const unsigned options = row % 16;
        const bool write = row & 16, share = row & 32, exists = row & 64;
        SCOPED_TRACE(testing::Message() << "options " << options << " write " << write << " share " << share
                                        << " exists " << exists);
        const bool create = options & 1, truncate = options & 4, temporary = options & 8;
        bool expected = exists || create;
        if (temporary && (!create || share || !write)) expected = false;
        if ((options & 3) && (!write || !create)) expected = false;
        if (truncate && !write) expected = false;

        if (exists)
            Put(path, "abc");
        else
            _DeleteFile(path);
        CFile file;
        const auto access = (write ? FileAccessWrite : FileAccessRead) | (share ? FileAccessShareRead : FileAccessRead);
        EXPECT_EQ(file.Open(path, access, static_cast<eOpenFileOptions>(options)), expected);
        EXPECT_EQ(file.GetSize(), !expected ? kNone : exists && !truncate ? 3u : 0u);
        EXPECT_EQ(_TestFileExists(path), exists || expected) << "also temporary files are visible while open";
        EXPECT_TRUE(file.Close());
        EXPECT_EQ(_TestFileExists(path), (exists || expected) && !(expected && temporary));
    }
}

TEST(FileOpen, RefusesNullEmptyOpenAndFolders) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    CFile file;
    EXPECT_FALSE(file.Open(nullptr, FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(L"", FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(folder.Path(), FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(folder.Path(), FileAccessWrite, OpenFileCreate));
    ASSERT_TRUE(file.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting)) << "already open";
    EXPECT_EQ(file.GetSize(), 1u) << "and still is";
}

TEST(FileOpen, CreatesOneMissingFolder) {
    ScratchFolder folder;
    CFile file;
    EXPECT_FALSE(file.Open(folder / L"a/b/file", FileAccessWrite, OpenFileCreate)) << "two are missing";
    EXPECT_FALSE(_TestDirExists(folder / L"a"));
    EXPECT_TRUE(file.Open(folder / L"a\\file", FileAccessWrite, OpenFileCreate));
    EXPECT_TRUE(_TestFileExists(folder / L"a/file"));
    file.Close();
    EXPECT_FALSE(file.Open(folder / L"a/missing", FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(folder / L"a/file/below", FileAccessWrite, OpenFileCreate)) << "a file in the way";
}

TEST(FileOpen, ReadingInAMissingFolderLeavesItBehind_Intended) {
    ScratchFolder folder;
    CFile file;
    EXPECT_FALSE(file.Open(folder / L"new/file", FileAccessRead, OpenFileExisting));
    EXPECT_TRUE(_TestDirExists(folder / L"new"));
    EXPECT_FALSE(file.Open(folder / L"other/file", FileAccessRead, OpenFileCreate))
        << "excluded before the system is asked";
    EXPECT_FALSE(_TestDirExists(folder / L"other"));
}

TEST(FileOpen, RunsOutOfMemoryCleanly) {
    ScratchFolder folder;
    support::ForEachFailingAllocation([&] {
        CFile file;
        const bool open = file.Open(folder / L"a/file", FileAccessWrite, OpenFileCreate);
        EXPECT_EQ(file.GetSize(), open ? 0u : kNone);
    });
    EXPECT_TRUE(_TestFileExists(folder / L"a/file"));
}

TEST(FileSharing, All64PairsAnswerAsTheRulesSay) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    for (unsigned kind = 0; kind < support::kSharingKinds; ++kind) {
        CFile first;
        ASSERT_TRUE(support::OpenAsKind(first, path, kind)) << kind;
        EXPECT_EQ(support::KindsThatOpen(path), support::KindsThatMayMeet(kind)) << kind;
        first.Close();
        EXPECT_EQ(support::KindsThatOpen(path), 0xFFu) << "closing lets go";
    }
}

TEST(FileSharing, ARefusedOpenDoesNotTruncate) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "kept");
    CFile reader, writer;
    ASSERT_TRUE(reader.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting));
    EXPECT_FALSE(writer.Open(path, FileAccessWrite | FileAccessShareRead, OpenFileTruncate));
    EXPECT_FALSE(writer.Open(path, FileAccessWrite | FileAccessShareRead, OpenFileCreate | OpenFileTruncate));
    EXPECT_EQ(reader.GetSize(), 4u);
}

TEST(FileSharing, ThreeHoldersAreEachAsked) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "x");
    const auto all = FileAccessShareRead | FileAccessShareWrite;
    CFile first, second, third;
    ASSERT_TRUE(first.Open(path, FileAccessRead | all, OpenFileExisting));
    ASSERT_TRUE(second.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting));
    EXPECT_FALSE(third.Open(path, FileAccessWrite | all, OpenFileExisting)) << "the second denies it";
    second.Close();
    EXPECT_TRUE(third.Open(path, FileAccessWrite | all, OpenFileExisting));
    EXPECT_FALSE(second.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting)) << "the third writes";
}

TEST(File, ClosedOneAnswersNothing) {
    CFile file;
    char byte = 'x';
    ulong32 done = 7;
    EXPECT_TRUE(file.Close());
    EXPECT_EQ(file.GetSize(), kNone);
    EXPECT_EQ(file.GetPointer(), kNone);
    EXPECT_FALSE(file.Flush() || file.SetPointer(0) || file.MovePointer(0) || file.SetEOF());
    EXPECT_FALSE(file.Read(&byte, 1, &done));
    EXPECT_EQ(done, 0u);
    done = 7;
    EXPECT_FALSE(file.Write(&byte, 1, &done));
    EXPECT_EQ(done, 0u);
}

TEST(File, ReadsWritesAndEnds) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    char buffer[16];
    ulong32 done = 7;
    CFile file;
    ASSERT_TRUE(file.Open(path, FileAccessWrite | FileAccessRandom, OpenFileCreate));
    EXPECT_TRUE(file.Write("0123456789", 10, nullptr));
    EXPECT_EQ(file.GetPointer(), 10u);
    EXPECT_TRUE(file.Read(buffer, 4, &done));
    EXPECT_EQ(done, 0u) << "at the end";
    EXPECT_TRUE(file.MovePointer(-3) && file.Read(buffer, 16, &done));
    EXPECT_EQ(std::string(buffer, done), "789") << "a short count at the end";
    EXPECT_TRUE(file.SetPointer(4) && file.SetEOF() && file.Flush());
    EXPECT_EQ(file.GetSize(), 4u);
    EXPECT_TRUE(file.SetPointer(6) && file.SetEOF());
    EXPECT_EQ(file.GetPointer(), 6u);
    EXPECT_TRUE(file.Write("x", 1, &done) && file.Write(nullptr, 0, &done));
    EXPECT_EQ(done, 0u);
    file.Close();
    EXPECT_EQ(Contents(path), std::string("0123\0\0x", 7)) << "the gap is zeros";
}

TEST(File, PositionsStayInRange) {
    ScratchFolder folder;
    CFile file;
    ASSERT_TRUE(file.Open(folder / L"file", FileAccessWrite, OpenFileCreate));
    EXPECT_TRUE(file.Write("abc", 3, nullptr));
    EXPECT_FALSE(file.MovePointer(-4));
    EXPECT_FALSE(file.MovePointer(LLONG_MIN));
    EXPECT_FALSE(file.SetPointer(std::size_t{1} << 63));
    EXPECT_FALSE(file.SetPointer(kNone));
    EXPECT_EQ(file.GetPointer(), 3u) << "refused moves change nothing";
    EXPECT_TRUE(file.MovePointer(-3));
    EXPECT_EQ(file.GetPointer(), 0u);
    EXPECT_TRUE(file.SetPointer(100)) << "beyond the end";
    EXPECT_EQ(file.GetSize(), 3u);
}

TEST(File, OpenedForReadingChangesNothing) {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    Put(path, "abc");
    CFile file;
    ulong32 done = 7;
    ASSERT_TRUE(file.Open(path, FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Write("x", 1, &done));
    EXPECT_EQ(done, 0u);
    EXPECT_FALSE(file.SetEOF());
    EXPECT_FALSE(file.Flush());
    EXPECT_EQ(file.GetSize(), 3u);
}

TEST(File, CrossesFourGiB) {
    ScratchFolder folder;
    constexpr std::size_t k4GiB = std::size_t{1} << 32;
    CFile file;
    ulong32 done = 0;
    char buffer[8] = {};
    ASSERT_TRUE(file.Open(folder / L"sparse", FileAccessWrite, OpenFileCreate));
    ASSERT_TRUE(file.SetPointer(k4GiB - 2));
    EXPECT_TRUE(file.Write("edge", 4, &done));
    EXPECT_EQ(file.GetPointer(), k4GiB + 2);
    EXPECT_EQ(file.GetSize(), k4GiB + 2);
    EXPECT_TRUE(file.MovePointer(-4) && file.Read(buffer, 8, &done));
    EXPECT_EQ(std::string(buffer, done), "edge");
    EXPECT_TRUE(file.MovePointer(-static_cast<long long>(k4GiB)));
    EXPECT_EQ(file.GetPointer(), 2u);
    EXPECT_TRUE(file.SetPointer(k4GiB + 1) && file.SetEOF());
    EXPECT_EQ(file.GetSize(), k4GiB + 1);
}

TEST(File, MovesItsHandle) {
    ScratchFolder folder;
    CFile first;
    ASSERT_TRUE(first.Open(folder / L"temporary", FileAccessWrite, OpenFileCreate | OpenFileTemporary));
    CFile second(std::move(first));
    EXPECT_EQ(first.GetSize(), kNone);
    EXPECT_EQ(second.GetSize(), 0u);
    CFile third;
    ASSERT_TRUE(third.Open(folder / L"other", FileAccessWrite, OpenFileCreate | OpenFileTemporary));
    third = std::move(second);
    EXPECT_FALSE(_TestFileExists(folder / L"other")) << "what it held was closed";
    EXPECT_TRUE(_TestFileExists(folder / L"temporary"));
    EXPECT_TRUE(third.Flush()) << "still opened for writing";
    third.Close();
    EXPECT_FALSE(_TestFileExists(folder / L"temporary"));
}

TEST(FileNames, OfEveryPlaneWork) {
    ScratchFolder folder;
    const wchar_t* kNames[] = {L"plain.txt", L"Gr\u00FC\u00DFe \u20AC.txt", L"\u65E5\u672C\u8A9E",
                               L"\U0001F600\U00010000\U0010FFFD.x"};
    for (const wchar_t* name : kNames) {
        Put(folder / name, "abc");
        EXPECT_TRUE(_TestFileExists(folder / name));
        EXPECT_EQ(List(folder.Path()), std::vector<WideText>{name});
        EXPECT_TRUE(CFile::RenameFile(folder / name, folder / L"moved"));
        EXPECT_FALSE(_TestFileExists(folder / name));
        EXPECT_TRUE(CFile::RenameFile(folder / L"moved", folder / name));
        EXPECT_EQ(Contents(folder / name), "abc");
        EXPECT_TRUE(CFile::DeleteFileW(folder / name));
    }
    EXPECT_TRUE(List(folder.Path()).empty());
}

TEST(FileActions, RenameNeverReplaces) {
    ScratchFolder folder;
    Put(folder / L"a", "a");
    Put(folder / L"b", "b");
    ASSERT_TRUE(_CreateDir(folder / L"d"));
    EXPECT_FALSE(CFile::RenameFile(folder / L"a", folder / L"b"));
    EXPECT_FALSE(CFile::RenameFile(folder / L"a", folder / L"d"));
    EXPECT_FALSE(CFile::RenameFile(folder / L"missing", folder / L"c"));
    EXPECT_FALSE(CFile::RenameFile(nullptr, folder / L"c") || CFile::RenameFile(folder / L"a", nullptr));
    EXPECT_FALSE(CFile::RenameFile(L"", folder / L"c") || CFile::RenameFile(folder / L"a", L""));
    EXPECT_EQ(Contents(folder / L"b"), "b");
    EXPECT_TRUE(CFile::RenameFile(folder / L"a", folder / L"d/a"));
    EXPECT_EQ(Contents(folder / L"d/a"), "a");
    EXPECT_TRUE(CFile::RenameFile(folder / L"d", folder / L"e")) << "folders too";
    EXPECT_EQ(Contents(folder / L"e/a"), "a");
}

TEST(FileActions, TellFilesFromFolders) {
    ScratchFolder folder;
    const WideText file = folder / L"file", dir = folder / L"dir";
    Put(file, "");
    EXPECT_TRUE(_CreateDir(dir));
    EXPECT_FALSE(_CreateDir(dir)) << "exists";
    EXPECT_FALSE(_CreateDir(file));
    EXPECT_FALSE(_CreateDir(folder / L"x/y")) << "one level only";
    EXPECT_FALSE(_CreateDir(nullptr) || _CreateDir(L""));
    EXPECT_TRUE(_TestFileExists(file) && _TestDirExists(dir) && _TestDirExists(dir + L"/") && _TestDirExists(L"."));
    EXPECT_FALSE(_TestFileExists(dir) || _TestDirExists(file) || _TestFileExists(folder / L"x") ||
                 _TestDirExists(folder / L"x"));
    EXPECT_FALSE(_TestFileExists(nullptr) || _TestFileExists(L"") || _TestDirExists(nullptr) || _TestDirExists(L""));
    EXPECT_FALSE(_DeleteFile(dir)) << "only files";
    EXPECT_FALSE(_DeleteFile(nullptr) || _DeleteFile(L"") || _DeleteFile(folder / L"x"));
    EXPECT_TRUE(_DeleteFile(file));
    EXPECT_FALSE(_TestFileExists(file));
}

// --- enumeration ----------------------------------------------------------------------------------------------------

namespace {

using Characters = std::vector<unsigned>;

// Code points, A to Z folded.
Characters FoldedCharacters(const wchar_t* text) {
    Characters result;
    for (; *text; ++text) {
        unsigned c = *text;
        if (c >= 0xD800 && c < 0xDC00 && text[1] >= 0xDC00 && text[1] < 0xE000)
            c = 0x10000 + ((c - 0xD800) << 10) + (*++text - 0xDC00);
        else if (c >= 'A' && c <= 'Z')
            c += 32;
        result.push_back(c);
    }
    return result;
}

bool NaivelyMatches(const Characters& name, const Characters& pattern, std::size_t n = 0, std::size_t p = 0) {
    if (p == pattern.size()) return n == name.size();
    if (pattern[p] == '*')
        return NaivelyMatches(name, pattern, n, p + 1) || (n < name.size() && NaivelyMatches(name, pattern, n + 1, p));
    return n < name.size() && (pattern[p] == '?' || pattern[p] == name[n]) &&
           NaivelyMatches(name, pattern, n + 1, p + 1);
}

} // namespace

TEST(Enumeration, MatchesAsANaiveMatcherDoes) {
    ScratchFolder folder;
    const wchar_t* kNames[] = {
        L"a",     L"ab",      L"abc.txt",          L"ABD.TXT",    L"abcabcabd",    L"long name.html",
        L"x.y.z", L"noext",   L"\u00E4rger.txt",   L"\U0001F600", L"a\U0001F600b", L"[a]",
        L"a+b",   L".hidden", L"aaaaaaaaaaaaaaaab"};
    for (const wchar_t* name : kNames) Put(folder / name, "");
    const wchar_t* kPatterns[] = {L"a*",       L"*a",
                                  L"*b*",      L"?",
                                  L"??",       L"???",
                                  L"*.txt",    L"*.TXT",
                                  L"a*c*d",    L"**",
                                  L"*?",       L"?*?",
                                  L"a?b",      L"x.?.*",
                                  L"*.",       L"*.htm",
                                  L"\u00C4*",  L"*\U0001F600*",
                                  L"[a]",      L"a+b",
                                  L".*",       L"*a*a*a*a*a*a*a*b",
                                  L"*abd",     L"ab",
                                  L"abc.txt?", L"missing"};
    for (const wchar_t* pattern : kPatterns) {
        std::vector<WideText> expected;
        for (const wchar_t* name : kNames)
            if (NaivelyMatches(FoldedCharacters(name), FoldedCharacters(pattern))) expected.push_back(name);
        std::sort(expected.begin(), expected.end());
        EXPECT_EQ(List(folder.Path(), pattern), expected) << testing::PrintToString(pattern);
    }
    for (const wchar_t* everything : {static_cast<const wchar_t*>(nullptr), L"", L"*", L"*.*"})
        EXPECT_EQ(List(folder.Path(), everything).size(), std::size(kNames)) << testing::PrintToString(everything);
}

TEST(Enumeration, FoldersAppearWhenAskedFor) {
    ScratchFolder folder;
    Put(folder / L"file", "12345");
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    EXPECT_EQ(List(folder.Path()), (std::vector<WideText>{L"dir", L"file"})) << "without the dots";
    EXPECT_EQ(List(folder.Path(), L"*", false), std::vector<WideText>{L"file"});
    EXPECT_EQ(List(folder.Path() + L"/"), List(folder.Path()));
    EXPECT_EQ(List(folder.Path() + L"\\"), List(folder.Path()));
    EXPECT_EQ(List(nullptr), List(L".")) << "null is the current folder";
    EXPECT_EQ(List(L""), List(L"."));
}

TEST(Enumeration, BeginsOnReadableFoldersOnly) {
    ScratchFolder folder;
    CDirectoryEnumerator listing;
    CFindData entry;
    EXPECT_FALSE(listing.GetNext(entry)) << "nothing begun";
    EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true)) << "empty, but there";
    EXPECT_FALSE(listing.GetNext(entry) || listing.GetNext(entry));
    Put(folder / L"file", "");
    EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), L"nothing", true));
    EXPECT_FALSE(listing.GetNext(entry));
    EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), L"f*", true)) << "a second begin ends the first";
    EXPECT_TRUE(listing.GetNext(entry));
    EXPECT_FALSE(listing.BeginEnumerate(folder / L"missing", nullptr, true));
    EXPECT_FALSE(listing.GetNext(entry));
    EXPECT_STREQ(entry.GetFilename(), L"file") << "kept where nothing was found";
    EXPECT_FALSE(listing.BeginEnumerate(folder / L"file", nullptr, true)) << "no folder";
    listing.EndEnumerate();
    listing.EndEnumerate();
}

TEST(Enumeration, TellsSizesAndTimes) {
    ScratchFolder folder;
    Put(folder / L"file", "12345");
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    CDirectoryEnumerator listing;
    CFindData entry;
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"file", false) && listing.GetNext(entry));
    EXPECT_EQ(entry.GetSize(), 5u);
    EXPECT_FALSE(entry.isDirectory() || entry.isReadOnly());
    // Milliseconds since 1970 to units of 100 ns since 1601.
    const auto now = (TAVO::Core::OS::GetTimeNow() + 11644473600000ULL) * 10000;
    constexpr unsigned long long kMinute = 600000000;
    for (const auto time :
         {entry.GetLastModified(), entry.GetLastAccessed(), entry.GetCreated() ? entry.GetCreated() : now}) {
        EXPECT_GT(time, now - kMinute);
        EXPECT_LT(time, now + kMinute);
    }
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"dir", true) && listing.GetNext(entry));
    EXPECT_TRUE(entry.isDirectory());
    EXPECT_EQ(entry.GetSize(), 0u);
}

TEST(Enumeration, RunsOutOfMemoryCleanly) {
    ScratchFolder folder;
    Put(folder / L"file", "");
    support::ForEachFailingAllocation([&] {
        CDirectoryEnumerator listing;
        CFindData entry;
        const bool begun = listing.BeginEnumerate(folder.Path(), L"f*", true);
        EXPECT_EQ(listing.GetNext(entry), begun);
    });
}
