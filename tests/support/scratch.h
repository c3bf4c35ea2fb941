#pragma once
// Wide paths and a folder of its own for tests that touch the file system.

#include <algorithm>
#include <filesystem>
#include <gtest/gtest.h>
#include <string>
#include <TAVO/core.h>
#include <TAVO/files.h>
#include <vector>

namespace support {

// A wide text that can be put together.
class WideText {
public:
    WideText(const wchar_t* text) {
        for (; *text; ++text) m_units.push_back(*text);
        m_units.push_back(0);
    }
    explicit WideText(const std::vector<wchar_t>& units) : m_units(units) { m_units.push_back(0); }
    operator const wchar_t*() const { return m_units.data(); }
    std::size_t Length() const { return m_units.size() - 1; }
    WideText operator+(const WideText& other) const {
        std::vector<wchar_t> units(m_units.begin(), m_units.end() - 1);
        units.insert(units.end(), other.m_units.begin(), other.m_units.end() - 1);
        return WideText(units);
    }
    bool operator==(const WideText& other) const { return m_units == other.m_units; }
    bool operator<(const WideText& other) const { return m_units < other.m_units; }

private:
    std::vector<wchar_t> m_units;
};

inline WideText Widen(const std::string& ascii) { return WideText(std::vector<wchar_t>(ascii.begin(), ascii.end())); }

// All entries of a folder, sorted.
inline std::vector<WideText> List(const wchar_t* folder, const wchar_t* pattern = nullptr, bool directories = true) {
    TAVO::Files::OS::CDirectoryEnumerator listing;
    TAVO::Files::OS::CFindData entry;
    std::vector<WideText> names;
    if (listing.BeginEnumerate(folder, pattern, directories))
        while (listing.GetNext(entry)) names.push_back(entry.GetFilename());
    std::sort(names.begin(), names.end());
    return names;
}

// An empty folder beside the test program; goes with everything in it.
class ScratchFolder {
public:
    ScratchFolder() { EXPECT_TRUE(TAVO::Files::FU_CreatePath(m_path)); }
    ~ScratchFolder() {
        std::error_code failed;
        std::filesystem::remove_all(std::u16string(&m_path[0], &m_path[0] + m_path.Length()), failed);
        EXPECT_FALSE(failed) << failed.message();
    }

    const WideText& Path() const { return m_path; }
    WideText operator/(const wchar_t* name) const { return m_path + L"/" + name; }

private:
    inline static int g_number = 0;
    WideText m_path =
        Widen("scratch_" + std::to_string(TAVO::Core::OS::GetTimeNow()) + "_" + std::to_string(++g_number));
};

// Makes a file with the given bytes.
inline void Put(const wchar_t* path, const std::string& bytes) {
    using namespace TAVO::Files::OS;
    CFile file;
    ASSERT_TRUE(file.Open(path, FileAccessWrite, OpenFileCreate | OpenFileTruncate));
    ASSERT_TRUE(file.Write(bytes.data(), static_cast<TAVO::ulong32>(bytes.size()), nullptr));
}

// The bytes of a file; "(no file)" when there is none.
inline std::string Get(const wchar_t* path) {
    using namespace TAVO::Files::OS;
    CFile file;
    if (!file.Open(path, FileAccessRead | FileAccessShareRead, OpenFileExisting)) return "(no file)";
    std::string bytes(file.GetSize(), 0);
    TAVO::ulong32 done = 0;
    EXPECT_TRUE(file.Read(bytes.data(), static_cast<TAVO::ulong32>(bytes.size()), &done) && done == bytes.size());
    return bytes;
}

// A test with a folder, a path in it where no file is yet, and what it takes to use one.
struct FileTest : testing::Test {
    ScratchFolder folder;
    const WideText path = folder / L"file";
    TAVO::Files::OS::CFile file;
    TAVO::ulong32 done = 7;
};

} // namespace support
