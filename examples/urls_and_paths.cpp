// URLs of files, escaped text, and the parts of paths.

#include <cstdio>
#include <cstring>
#include <TAVO/files.h>
#include <TAVO/internetional.h>

using namespace TAVO::Files;
using namespace TAVO::Internetional;
using TAVO::String::CACFWChar;
using TAVO::String::CUTF8Char;

namespace {

const char* Shown(const unsigned char* text) { return text ? reinterpret_cast<const char*>(text) : "(none)"; }
bool Same(const unsigned char* text, const char* expected) { return std::strcmp(Shown(text), expected) == 0; }

} // namespace

int main() {
    // A path as a URL, which gives exactly the same path back.
    const wchar_t* const reel = L"D:\\Projet été\\reel 1.mov";
    const CUTF8Char url = file_EncodeURL(reel);
    const CACFWChar back = file_DecodeURL(url);
    bool fine = Same(url, "file:///D%3A%5CProjet%20%C3%A9t%C3%A9%5Creel%201.mov") &&
                Same(CUTF8Char(back), Shown(CUTF8Char(reel)));

    // The forms of others are read too.
    fine = fine && Same(CUTF8Char(file_DecodeURL(L"file://localhost/C:/a%20b")), "C:/a b") &&
           Same(CUTF8Char(file_DecodeURL(L"file://server/share/x")), "//server/share/x") &&
           !file_DecodeURL(L"http://server/x") && !file_DecodeURL(L"file:///a%00b");

    // Escaping into a buffer: first the size, then the text. The set "/" is kept as it is.
    const auto* const query = reinterpret_cast<const unsigned char*>("reel=1/take two");
    const auto* const slash = reinterpret_cast<const unsigned char*>("/");
    unsigned char text[64];
    fine = fine && URL_encoderequired(query, slash) < sizeof(text) && URL_encodebuffer(text, query, slash) &&
           Same(text, "reel%3D1/take%20two") && URL_checkescape(text, slash);
    URL_decodebuffer(text, text); // in place
    fine = fine && Same(text, Shown(query));

    // The parts of a path; joined they are the path again.
    tagCPATHPARSEINFO parts;
    fine = fine && FU_ParsePath(back, parts) && parts.eRoot == PathRootDrive && Same(CUTF8Char(parts.sStem), "reel 1");
    parts.sExtension = L"wav";
    const CUTF8Char sound(FU_FormatPath(parts));
    fine = fine && Same(sound, "D:\\Projet \xC3\xA9t\xC3\xA9\\reel 1.wav");

    // Before a path from outside is joined to a folder of one's own: does it lead straight down, and has it no root?
    tagPATHPARSEINFO inside;
    const struct {
        const wchar_t* path;
        bool safe;
    } asked[] = {{L"clips/a.mov", true}, {L"../secret", false}, {L"C:/a.mov", false}, {L"clips/con*", false}};
    for (const auto& row : asked) {
        const bool safe = FU_IsStraightPath(row.path) && FU_ParsePath(row.path, inside) && inside.eRoot == PathRootNone;
        std::printf("%-12s %s\n", Shown(CUTF8Char(row.path)), safe ? "safe" : "refused");
        fine = fine && safe == row.safe;
    }
    std::printf("%s\n%s\n", Shown(url), Shown(sound));
    return fine ? 0 : 1;
}
