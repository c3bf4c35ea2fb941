// Files and directories, and the texts of paths: taking apart, joining, checking, creating.

#include "support/heapwatch.h"
#include "support/scratch.h"
#include "support/sharing.h"

#include <climits>

using namespace support;
using namespace TAVO::Files;
using namespace TAVO::Files::OS;
using File = FileTest;

static constexpr std::size_t kNone = ~std::size_t{0};
static constexpr const wchar_t* kNull = nullptr;

// Every combination of options, access, sharing and an existing or missing file, against the rules written out.
TEST_F(File, OpenByTheTableOfOptions) {
    for (unsigned row = 0; row < 128; ++row) {
        const unsigned options = row % 16;
        const bool write = row & 16, share = row & 32, exists = row & 64;
        SCOPED_TRACE(testing::Message() << options << " write " << write << " share " << share << " exists " << exists);
        const bool create = options & 1, truncate = options & 4, temporary = options & 8;
        bool expected = exists || create;
        if (temporary && (!create || share || !write)) expected = false;
        if ((options & 3) && (!write || !create)) expected = false;
        if (truncate && !write) expected = false;

        _DeleteFile(path);
        if (exists) Put(path, "abc");
        const auto access = (write ? FileAccessWrite : FileAccessRead) | (share ? FileAccessShareRead : FileAccessRead);
        EXPECT_EQ(file.Open(path, access, static_cast<eOpenFileOptions>(options)), expected);
        EXPECT_EQ(file.GetSize(), !expected ? kNone : exists && !truncate ? 3u : 0u);
        EXPECT_EQ(_TestFileExists(path), exists || expected) << "also temporary files are visible while open";
        EXPECT_TRUE(file.Close());
        EXPECT_EQ(_TestFileExists(path), (exists || expected) && !(expected && temporary));
    }
}

TEST_F(File, RefusesWhatIsNoFileAndOnlyReadsWhenAskedTo) {
    Put(path, "x");
    for (const wchar_t* wrong : {kNull, L"", static_cast<const wchar_t*>(folder.Path())})
        EXPECT_FALSE(file.Open(wrong, FileAccessRead, OpenFileExisting) ||
                     file.Open(wrong, FileAccessWrite, OpenFileCreate));
    ASSERT_TRUE(file.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting)) << "already open";
    EXPECT_FALSE(file.Write("y", 1, &done) || file.SetEOF() || file.Flush()) << "opened for reading";
    EXPECT_TRUE(done == 0 && file.GetSize() == 1 && file.Close() && file.Close());
    EXPECT_TRUE(file.GetSize() == kNone && file.GetPointer() == kNone);
    EXPECT_FALSE(file.Flush() || file.SetPointer(0) || file.MovePointer(0) || file.SetEOF());
    char byte = 'y';
    done = 7;
    EXPECT_FALSE(file.Read(&byte, 1, &done) || std::exchange(done, 7) || file.Write(&byte, 1, &done) || done)
        << "closed";
}

// Intended: open-makes-folder
TEST_F(File, CreatesOneMissingFolderEvenToRead_Intended) {
    EXPECT_FALSE(file.Open(folder / L"a/b/file", FileAccessWrite, OpenFileCreate)) << "two are missing";
    EXPECT_FALSE(_TestDirExists(folder / L"a"));
    EXPECT_TRUE(file.Open(folder / L"a\\file", FileAccessWrite, OpenFileCreate) && file.Close());
    EXPECT_FALSE(file.Open(folder / L"a/file/below", FileAccessWrite, OpenFileCreate)) << "a file in the way";
    EXPECT_FALSE(file.Open(folder / L"new/file", FileAccessRead, OpenFileExisting));
    EXPECT_FALSE(file.Open(folder / L"other/file", FileAccessRead, OpenFileCreate)) << "excluded before that";
    EXPECT_EQ(List(folder.Path()), (std::vector<WideText>{L"a", L"new"}));
}

TEST_F(File, All64PairsShareAsTheRulesSayInEveryProcess) {
    Put(path, "kept");
    for (unsigned kind = 0; kind < kSharingKinds; ++kind) {
        ASSERT_TRUE(OpenAsKind(file, path, kind)) << kind;
        EXPECT_EQ(KindsThatOpen(path), KindsThatMayMeet(kind)) << kind;
        EXPECT_EQ(KindsThatOpenElsewhere(path), KindsThatMayMeet(kind)) << kind;
        file.Close();
        EXPECT_EQ(KindsThatOpen(path), 0xFFu) << "closing lets go";
    }
    const auto all = FileAccessShareRead | FileAccessShareWrite;
    CFile second, writer;
    ASSERT_TRUE(file.Open(path, FileAccessRead | all, OpenFileExisting));
    ASSERT_TRUE(second.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting));
    for (const auto options : {OpenFileTruncate, OpenFileCreate | OpenFileTruncate, OpenFileExisting})
        EXPECT_FALSE(writer.Open(path, FileAccessWrite | all, options)) << "asks every holder";
    EXPECT_EQ(file.GetSize(), 4u) << "a refused one does not truncate";
}

TEST_F(File, ReadWriteAndEnd) {
    char buffer[16];
    ASSERT_TRUE(file.Open(path, FileAccessWrite | FileAccessRandom, OpenFileCreate));
    EXPECT_TRUE(file.Write("0123456789", 10, nullptr) && file.GetPointer() == 10);
    EXPECT_TRUE(file.Read(buffer, 4, &done) && done == 0) << "at the end";
    EXPECT_TRUE(file.MovePointer(-3) && file.Read(buffer, 16, &done));
    EXPECT_EQ(std::string(buffer, done), "789") << "a short count at the end";
    EXPECT_FALSE(file.MovePointer(-11) || file.MovePointer(LLONG_MIN) || file.SetPointer(std::size_t{1} << 63));
    EXPECT_TRUE(file.MovePointer(-6) && file.SetEOF() && file.Flush()) << "refused moves changed nothing";
    EXPECT_TRUE(file.GetSize() == 4 && file.SetPointer(100) && file.GetSize() == 4) << "beyond the end";
    EXPECT_TRUE(file.SetPointer(6) && file.SetEOF() && file.GetPointer() == 6);
    EXPECT_TRUE(file.Write("x", 1, &done) && file.Write(nullptr, 0, &done) && done == 0);
    file.Close();
    EXPECT_EQ(Get(path), std::string("0123\0\0x", 7)) << "the gap is zeros";
}

TEST_F(File, CrossFourGiBAndMoveTheirHandles) {
    constexpr std::size_t k4GiB = std::size_t{1} << 32;
    char buffer[8] = {};
    ASSERT_TRUE(file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTemporary) && file.SetPointer(k4GiB - 2));
    EXPECT_TRUE(file.Write("edge", 4, nullptr) && file.GetPointer() == k4GiB + 2 && file.GetSize() == k4GiB + 2);
    EXPECT_TRUE(file.MovePointer(-4) && file.Read(buffer, 8, &done));
    EXPECT_EQ(std::string(buffer, done), "edge");
    EXPECT_TRUE(file.MovePointer(-static_cast<long long>(k4GiB)) && file.GetPointer() == 2);
    EXPECT_TRUE(file.SetPointer(k4GiB + 1) && file.SetEOF() && file.GetSize() == k4GiB + 1);

    CFile second(std::move(file)), third;
    EXPECT_TRUE(file.GetSize() == kNone && second.GetSize() == k4GiB + 1);
    ASSERT_TRUE(third.Open(folder / L"other", FileAccessWrite, OpenFileCreate | OpenFileTemporary));
    third = std::move(second);
    EXPECT_EQ(List(folder.Path()), std::vector<WideText>{L"file"}) << "what it held was closed";
    EXPECT_TRUE(third.Flush() && third.Close() && !_TestFileExists(path)) << "still for writing, still temporary";
}

TEST_F(File, TellFilesFromFoldersAndNeverReplace) {
    const WideText dir = folder / L"dir", missing = folder / L"x", inside = dir + L"/file";
    EXPECT_TRUE(_CreateDir(dir));
    Put(path, "");
    Put(inside, "inside");
    EXPECT_FALSE(_CreateDir(dir) || _CreateDir(path) || _CreateDir(missing + L"/y")) << "one level only";
    EXPECT_TRUE(_TestFileExists(path) && _TestDirExists(dir) && _TestDirExists(dir + L"/") && _TestDirExists(L"."));
    EXPECT_FALSE(_TestFileExists(dir) || _TestDirExists(path) || _DeleteFile(dir) || _DeleteFile(missing));
    // Intended: rename-keeps
    EXPECT_FALSE(CFile::RenameFile(missing, dir) || CFile::RenameFile(path, inside) || CFile::RenameFile(path, dir));
    for (const wchar_t* nothing : {kNull, L""}) {
        EXPECT_FALSE(_TestFileExists(nothing) || _TestDirExists(nothing) || _DeleteFile(nothing));
        EXPECT_FALSE(_CreateDir(nothing) || CFile::RenameFile(nothing, missing) || CFile::RenameFile(path, nothing));
    }
    EXPECT_TRUE(CFile::RenameFile(dir, missing)) << "folders too";
    EXPECT_EQ(Get(missing + L"/file"), "inside");
    EXPECT_TRUE(_DeleteFile(path) && !_TestFileExists(path));
}

// With A to Z folded and the units of a pair, where the pattern has one, compared one by one.
static bool NaivelyMatches(const wchar_t* name, const wchar_t* pattern) {
    const auto folded = [](wchar_t c) { return c >= 'A' && c <= 'Z' ? c + 32 : c; };
    if (!*pattern) return !*name;
    if (*pattern == '*') return NaivelyMatches(name, pattern + 1) || (*name && NaivelyMatches(name + 1, pattern));
    if (*pattern == '?')
        return *name && NaivelyMatches(name + (*name >= 0xD800 && *name < 0xDC00 ? 2 : 1), pattern + 1);
    return folded(*name) == folded(*pattern) && NaivelyMatches(name + 1, pattern + 1);
}

TEST_F(File, AreListedAsANaiveMatcherFindsThem) {
    const wchar_t* kNames[] = {L"a",         L"ab",      L"abc.txt",        L"ABD.TXT", L"abcabcabd",
                               L"name.html", L".hidden", L"\u00E4rger.txt", L"[a]",     L"a\U0001F600b",
                               L"x.y.z",     L"a+b",     L"\U0001F600",     L"noext",   L"aaaaaaaaaaaaaaaab"};
    for (const wchar_t* name : kNames) Put(folder / name, "");
    for (const wchar_t* pattern :
         {L"a*",  L"*a",  L"*b*", L"?",    L"??",       L"???", L"*.txt",   L"*.TXT",           L"a*c*d",
          L"**",  L"*?",  L"?*?", L"a?b",  L"x.?.*",    L"*.",  L"*.htm",   L"\u00C4*",         L"*\U0001F600*",
          L"[a]", L"a+b", L".*",  L"*abd", L"abc.txt?", L"ab",  L"missing", L"*a*a*a*a*a*a*a*b"}) {
        std::vector<WideText> expected;
        for (const wchar_t* name : kNames)
            if (NaivelyMatches(name, pattern)) expected.push_back(name);
        std::sort(expected.begin(), expected.end());
        EXPECT_EQ(List(folder.Path(), pattern), expected) << testing::PrintToString(pattern);
    }
    for (const wchar_t* everything : {kNull, L"", L"*", L"*.*"})
        EXPECT_EQ(List(folder.Path(), everything).size(), std::size(kNames)) << testing::PrintToString(everything);
}

TEST_F(File, AreListedWithWhatIsKnownOfThem) {
    CDirectoryEnumerator listing;
    CFindData entry;
    EXPECT_FALSE(listing.GetNext(entry)) << "nothing begun";
    EXPECT_TRUE(listing.BeginEnumerate(folder.Path(), nullptr, true)) << "empty, but there";
    EXPECT_FALSE(listing.GetNext(entry) || listing.GetNext(entry));
    Put(path, "12345");
    ASSERT_TRUE(_CreateDir(folder / L"dir"));
    for (const wchar_t* end : {L"", L"/", L"\\"})
        EXPECT_EQ(List(folder.Path() + end), (std::vector<WideText>{L"dir", L"file"})) << "without the dots";
    EXPECT_EQ(List(folder.Path(), L"*", false), std::vector<WideText>{L"file"});
    EXPECT_TRUE(List(nullptr) == List(L".") && List(L"") == List(L".")) << "the current folder";
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"d*", true) && listing.GetNext(entry));
    EXPECT_TRUE(entry.isDirectory() && entry.GetSize() == 0);
    ASSERT_TRUE(listing.BeginEnumerate(folder.Path(), L"f*", true) && listing.GetNext(entry)) << "ends the first";
    EXPECT_FALSE(entry.isDirectory() || entry.isReadOnly() || entry.GetSize() != 5);
    // Milliseconds since 1970 to units of 100 ns since 1601.
    const auto now = (TAVO::Core::OS::GetTimeNow() + 11644473600000ULL) * 10000;
    constexpr unsigned long long kMinute = 600000000;
    for (const auto time : {entry.GetLastModified(), entry.GetLastAccessed(), entry.GetCreated()})
        EXPECT_TRUE(time == 0 ? time == entry.GetCreated() : time > now - kMinute && time < now + kMinute) << time;
    EXPECT_FALSE(listing.BeginEnumerate(folder / L"missing", nullptr, true) || listing.GetNext(entry));
    EXPECT_STREQ(entry.GetFilename(), L"file") << "kept where nothing was found";
    EXPECT_FALSE(listing.BeginEnumerate(path, nullptr, true)) << "no folder";
    listing.EndEnumerate();
    ForEachFailingAllocation([&] {
        CFile created;
        CDirectoryEnumerator names;
        const bool open = created.Open(folder / L"a/file", FileAccessWrite, OpenFileCreate);
        EXPECT_EQ(created.GetSize(), open ? 0u : kNone);
        EXPECT_TRUE(!names.BeginEnumerate(folder.Path(), L"a*", true) || names.GetNext(entry) || !open);
    });
}

// --- paths -----------------------------------------------------------------------------------------------------------

using Texts = std::vector<WideText>; // root, folder, stem, extension

static Texts PartsOf(const tagCPATHPARSEINFO& in) { return {*in.sRoot, *in.sFolder, *in.sStem, *in.sExtension}; }
static WideText Part(const wchar_t* text, std::size_t n) { return WideText(std::vector<wchar_t>(text, text + n)); }

TEST(ParsePath, FollowsTheTable) {
    const std::tuple<const wchar_t*, ePathRoot, Texts> rows[] = {
        {L"name.ext", PathRootNone, {L"", L"", L"name", L".ext"}},
        {L".profile", PathRootNone, {L"", L"", L".profile", L""}},
        {L"...", PathRootNone, {L"", L"", L"..", L"."}},
        {L"a\\b/c//d.e", PathRootNone, {L"", L"a\\b/c//", L"d", L".e"}},
        {L"a/", PathRootNone, {L"", L"a/", L"", L""}},
        {L"c:a\\b", PathRootDriveRelative, {L"c:", L"a\\", L"b", L""}},
        {L"\\\\server\\share\\a\\b.c", PathRootNetwork, {L"\\\\server\\share\\", L"a\\", L"b", L".c"}},
        {L"\\\\.\\pipe\\x", PathRootDevice, {L"\\\\.\\", L"pipe\\", L"x", L""}},
        {L"\\\\?\\UNC\\server\\share\\a", PathRootDevice, {L"\\\\?\\UNC\\server\\share\\", L"", L"a", L""}}};
    tagPATHPARSEINFO parts;
    tagCPATHPARSEINFO texts;
    for (const auto& [path, kind, expected] : rows) {
        SCOPED_TRACE(testing::PrintToString(path));
        ASSERT_TRUE(FU_ParsePath(path, parts) && FU_ParsePath(path, texts));
        EXPECT_TRUE(parts.eRoot == kind && texts.eRoot == kind && PartsOf(texts) == expected);
        EXPECT_EQ((Texts{Part(parts.pRoot, parts.nRoot), Part(parts.pFolder, parts.nFolder),
                         Part(parts.pStem, parts.nStem), Part(parts.pExtension, parts.nExtension)}),
                  expected);
        texts.sStem = path;
        EXPECT_TRUE(FU_ParsePath(*texts.sStem, texts)) << "a text of the record itself";
        EXPECT_STREQ(*FU_FormatPath(texts), path);
    }
    for (const wchar_t* nothing : {kNull, L""}) {
        EXPECT_FALSE(FU_ParsePath(nothing, parts) || FU_ParsePath(nothing, texts));
        EXPECT_EQ(parts.eRoot + parts.nRoot + parts.nFolder + parts.nStem + parts.nExtension, 0u);
        EXPECT_FALSE(texts.sRoot || texts.sFolder || texts.sStem || texts.sExtension);
        EXPECT_STREQ(*FU_FormatPath(parts), L"");
        EXPECT_STREQ(*FU_FormatPath(texts), L"");
    }
}

TEST(FormatPath, PutsInWhatIsMissingAndSurvivesFailingAllocations) {
    const wchar_t* const kRows[][5] = {
        {L"", L"a", L"b", L"c", L"a/b.c"},     {L"C:\\", L"a", L"b", L".c", L"C:\\a\\b.c"},
        {L"", L"a\\b", L"c", L"", L"a\\b\\c"}, {L"", L"a", L"", L"", L"a"},
        {L"", L"a", L"", L"txt", L"a/.txt"},   {L"//s/x/", L"a\\b", L"c", L"", L"//s/x/a\\b/c"}};
    for (const auto& [root, folder, stem, extension, expected] : kRows) {
        tagCPATHPARSEINFO info;
        info.sRoot = root, info.sFolder = folder, info.sStem = stem, info.sExtension = extension;
        EXPECT_STREQ(*FU_FormatPath(info), expected);
    }
    const WideText path = Widen("C:\\" + std::string(700, 'a') + "\\" + std::string(300, 'b') + ".ext");
    ForEachFailingAllocation([&] {
        tagCPATHPARSEINFO info;
        const bool parsed = FU_ParsePath(path, info);
        EXPECT_TRUE(!info.sRoot == !parsed && !info.sExtension == !parsed) << "all or nothing";
        if (!parsed) return;
        const auto joined = FU_FormatPath(info);
        EXPECT_TRUE(!joined || WideText(*joined) == path);
    });
}

TEST_F(File, PathsAreCreatedWithEveryMissingFolder) {
    for (const wchar_t* made : {L"a\\b/c", L"a/b/c", L"a//d/e\\", L"\U0001F600/\u00E4"})
        EXPECT_TRUE(FU_CreatePath(folder / made) && _TestDirExists(folder / made));
    Put(path, "");
    EXPECT_FALSE(FU_CreatePath(path) || FU_CreatePath(folder / L"x/../file/y")) << "a file in the way";
    EXPECT_TRUE(_TestDirExists(folder / L"x") && FU_CreatePath(L".")) << "nothing is undone";
    EXPECT_FALSE(FU_CreatePath(nullptr) || FU_CreatePath(L""));
    // The fuzz replay compares paths of bytes with a naive reading.
    EXPECT_TRUE(FU_IsStraightPath(L"\u65E5\u672C") && FU_IsStraightPath(L"\U0001F600"));
    EXPECT_FALSE(FU_IsStraightPath(L"a/../b") || FU_IsStraightPath(L"") || FU_IsStraightPath(nullptr));
}
