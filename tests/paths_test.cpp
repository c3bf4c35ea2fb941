// Path texts: taking apart, joining, checking, creating.

#include "support/heapwatch.h"
#include "support/scratch.h"

#include <algorithm>

using namespace TAVO::Files;
using CreatePath = support::FileTest;
using support::WideText;

namespace {

using Texts = std::vector<WideText>; // root, folder, stem, extension

Texts PartsOf(const tagCPATHPARSEINFO& info) { return {*info.sRoot, *info.sFolder, *info.sStem, *info.sExtension}; }
WideText Part(const wchar_t* text, std::size_t length) { return WideText(std::vector<wchar_t>(text, text + length)); }

} // namespace

TEST(ParsePath, FollowsTheTable) {
    const struct {
        const wchar_t* path;
        ePathRoot kind;
        Texts parts;
    } rows[] = {{L"name.ext", PathRootNone, {L"", L"", L"name", L".ext"}},
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
    for (const auto& row : rows) {
        SCOPED_TRACE(testing::PrintToString(row.path));
        ASSERT_TRUE(FU_ParsePath(row.path, parts) && FU_ParsePath(row.path, texts));
        EXPECT_TRUE(parts.eRoot == row.kind && texts.eRoot == row.kind && PartsOf(texts) == row.parts);
        EXPECT_EQ((Texts{Part(parts.pRoot, parts.nRoot), Part(parts.pFolder, parts.nFolder),
                         Part(parts.pStem, parts.nStem), Part(parts.pExtension, parts.nExtension)}),
                  row.parts);
        texts.sStem = row.path;
        EXPECT_TRUE(FU_ParsePath(*texts.sStem, texts)) << "a text of the record itself";
        EXPECT_STREQ(*FU_FormatPath(texts), row.path);
    }
    for (const wchar_t* nothing : {static_cast<const wchar_t*>(nullptr), L""}) {
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
    const WideText path = support::Widen("C:\\" + std::string(700, 'a') + "\\" + std::string(300, 'b') + ".ext");
    support::ForEachFailingAllocation([&] {
        tagCPATHPARSEINFO info;
        const bool parsed = FU_ParsePath(path, info);
        EXPECT_TRUE(!info.sRoot == !parsed && !info.sExtension == !parsed) << "all or nothing";
        if (!parsed) return;
        const auto joined = FU_FormatPath(info);
        EXPECT_TRUE(!joined || WideText(*joined) == path);
    });
}

TEST_F(CreatePath, MakesEveryMissingFolder) {
    for (const wchar_t* made : {L"a\\b/c", L"a/b/c", L"a//d/e\\", L"\U0001F600/\u00E4"})
        EXPECT_TRUE(FU_CreatePath(folder / made) && OS::_TestDirExists(folder / made));
    support::Put(path, "");
    EXPECT_FALSE(FU_CreatePath(path) || FU_CreatePath(folder / L"x/../file/y")) << "a file in the way";
    EXPECT_TRUE(OS::_TestDirExists(folder / L"x") && FU_CreatePath(L".")) << "nothing is undone";
    EXPECT_FALSE(FU_CreatePath(nullptr) || FU_CreatePath(L""));
    // The fuzz replay compares paths of bytes with a naive reading.
    EXPECT_TRUE(FU_IsStraightPath(L"\u65E5\u672C") && FU_IsStraightPath(L"\U0001F600"));
    EXPECT_FALSE(FU_IsStraightPath(L"a/../b") || FU_IsStraightPath(L"") || FU_IsStraightPath(nullptr));
}
