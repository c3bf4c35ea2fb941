// Opening and renaming.

#include "contract.h"

#include <TAVO/files.h>

namespace contract {

using namespace TAVO::Files;
using namespace TAVO::Files::OS;

static bool Make(const wchar_t* path) { return CFile().Open(path, FileAccessWrite, OpenFileCreate); }

void Files() {
    const wchar_t *const kFolder = L"contract_files", *const kFile = L"contract_files/one";
    Is("opening to read makes a missing folder",
       !CFile().Open(kFile, FileAccessRead, OpenFileExisting) && _TestDirExists(kFolder));
    Instead("look first, which makes nothing",
            !_TestFileExists(L"contract_none/file") && !_TestDirExists(L"contract_none"));

    const bool made = Make(kFile) && Make(L"contract_files/two");
    Is("renaming never replaces a file", made && !CFile::RenameFile(kFile, L"contract_files/two"));
    Instead("delete it first", _DeleteFile(L"contract_files/two") && CFile::RenameFile(kFile, L"contract_files/two"));

    CDirectoryEnumerator names;
    CFindData found;
    Is("*.* matches names without a dot", names.BeginEnumerate(kFolder, L"*.*", false) && names.GetNext(found));
    _DeleteFile(L"contract_files/two"); // an empty folder stays: the library deletes files only
}

} // namespace contract
