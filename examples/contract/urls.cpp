// Escapes, and the URLs of paths.

#include "contract.h"

#include <cstring>
#include <TAVO/files.h>
#include <TAVO/internetional.h>

namespace contract {

using namespace TAVO::Files;
using namespace TAVO::Internetional;
using namespace TAVO::String;

static const unsigned char* Utf8(const char* text) { return reinterpret_cast<const unsigned char*>(text); }
static bool Same(const unsigned char* text, const char* expected) {
    return text && std::strcmp(reinterpret_cast<const char*>(text), expected) == 0;
}

void Urls() {
    unsigned char text[32];
    Is("a % in the extra set is kept, and the text does not come back",
       URL_encodebuffer(text, Utf8("%41"), Utf8("%")) && (URL_decodebuffer(text, text), Same(text, "A")));
    Instead("leave it out",
            URL_encodebuffer(text, Utf8("%41"), nullptr) && (URL_decodebuffer(text, text), Same(text, "%41")));
    URL_decodebuffer(text, Utf8("a%00b"));
    Is("%00 ends what was decoded", Same(text, "a"));
    Is("the URL of a path escapes all of it", Same(CUTF8Char(file_EncodeURL(L"C:\\a")), "file:///C%3A%5Ca"));
    Is("the one of a POSIX path has four slashes", Same(CUTF8Char(file_EncodeURL(L"/a")), "file:////a"));
    Instead("write file:// and the path, which is read too", wcscmpi(*file_DecodeURL(L"file:///a"), L"/a") == 0);
    Is("a pair becomes %01", Same(CUTF8Char(file_EncodeURL(L"/\xD83D\xDE00")), "file:////%01"));
    Is("a relative path comes back as an absolute one", wcscmpi(*file_DecodeURL(file_EncodeURL(L"a")), L"/a") == 0);
}

} // namespace contract
