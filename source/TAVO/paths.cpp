// Paths as text: taking apart, joining, checking. Only FU_CreatePath touches the file system.

#include "platform/heap.h"

#include <cstring>
#include <initializer_list>
#include <TAVO/files.h>

namespace TAVO::Files {

namespace {

using String::_isSlash;

std::size_t LengthOf(const wchar_t* text) {
    std::size_t length = 0;
    if (text)
        while (text[length]) ++length;
    return length;
}

bool IsLetter(wchar_t c) { return (c >= L'A' && c <= L'Z') || (c >= L'a' && c <= L'z'); }

// Room for a text of `length` units and its terminator: on the stack for ordinary paths.
class Scratch {
public:
    explicit Scratch(std::size_t length)
        : m_text(length < kInline ? m_inline
                                  : static_cast<wchar_t*>(Platform::Allocate((length + 1) * sizeof(wchar_t)))) {
        if (m_text) m_text[0] = 0;
    }
    Scratch(const Scratch&) = delete;
    ~Scratch() {
        if (m_text != m_inline) Platform::Release(m_text);
    }
    wchar_t* Get() { return m_text; } // null without memory

    void Append(const wchar_t* text, std::size_t length) {
        if (length) std::memcpy(m_text + m_length, text, length * sizeof(wchar_t));
        m_length += length;
        m_text[m_length] = 0;
    }
    void Append(wchar_t c) { Append(&c, 1); }

private:
    static constexpr std::size_t kInline = 264;

    wchar_t m_inline[kInline];
    wchar_t* m_text;
    std::size_t m_length = 0;
};

// --- roots ----------------------------------------------------------------------------------------------------------
//
// Each function returns the units its form of root takes at the start of `path`, 0 when the path does not start with
// that form.

// "server\share\", the last separator optional; neither name may be empty.
std::size_t MatchShare(const wchar_t* path) {
    std::size_t server = 0;
    while (path[server] && !_isSlash(path[server])) ++server;
    if (server == 0 || !path[server]) return 0;
    std::size_t end = server + 1;
    while (path[end] && !_isSlash(path[end])) ++end;
    if (end == server + 1) return 0;
    return path[end] ? end + 1 : end;
}

std::size_t MatchDrive(const wchar_t* path) {
    return IsLetter(path[0]) && path[1] == L':' && _isSlash(path[2]) ? 3 : 0;
}

std::size_t MatchDevice(const wchar_t* path) {
    constexpr std::size_t kPrefix = 4; // \\?\ or \\.\ ...
    if (!_isSlash(path[0]) || !_isSlash(path[1]) || (path[2] != L'?' && path[2] != L'.') || !_isSlash(path[3]))
        return 0;
    const wchar_t* rest = path + kPrefix;
    if (String::wcsncmpi(rest, L"UNC", 3) == 0 && _isSlash(rest[3]))
        if (const std::size_t share = MatchShare(rest + 4)) return kPrefix + 4 + share;
    return kPrefix + MatchDrive(rest);
}

std::size_t MatchNetwork(const wchar_t* path) {
    if (!_isSlash(path[0]) || !_isSlash(path[1])) return 0;
    const std::size_t share = MatchShare(path + 2);
    return share ? 2 + share : 0;
}

std::size_t MatchDriveRelative(const wchar_t* path) { return IsLetter(path[0]) && path[1] == L':' ? 2 : 0; }
std::size_t MatchRooted(const wchar_t* path) { return _isSlash(path[0]) ? 1 : 0; }
std::size_t MatchNone(const wchar_t*) { return 0; }

struct RootForm {
    ePathRoot kind;
    std::size_t (*match)(const wchar_t* path);
};

// In the order of trying: every form before those that it also looks like.
constexpr RootForm kRootForms[] = {
    {PathRootDevice, MatchDevice}, {PathRootNetwork, MatchNetwork},
    {PathRootDrive, MatchDrive},   {PathRootDriveRelative, MatchDriveRelative},
    {PathRootRooted, MatchRooted}, {PathRootNone, MatchNone},
};

ePathRoot MatchRoot(const wchar_t* path, std::size_t& length) {
    for (const auto& form : kRootForms)
        if ((length = form.match(path)) > 0) return form.kind;
    return PathRootNone;
}

// --- parts ----------------------------------------------------------------------------------------------------------

bool IsDots(const wchar_t* name, std::size_t length) {
    return name[0] == L'.' && (length == 1 || (length == 2 && name[1] == L'.'));
}

// Units of the name before its extension.
std::size_t StemLength(const wchar_t* name, std::size_t length) {
    if (IsDots(name, length)) return length;
    for (std::size_t i = length; i-- > 1;)
        if (name[i] == L'.') return i;
    return length;
}

bool Assign(String::CACFWChar& target, const wchar_t* text, std::size_t length) {
    Scratch copy(length);
    if (!copy.Get()) return false;
    copy.Append(text, length);
    target = static_cast<const wchar_t*>(copy.Get());
    return static_cast<bool>(target);
}

wchar_t FirstSeparator(const wchar_t* text, std::size_t length) {
    for (std::size_t i = 0; i < length; ++i)
        if (_isSlash(text[i])) return text[i];
    return 0;
}

// The separator that belongs between folder and name, 0 when none is missing.
wchar_t MissingSeparator(const tagPATHPARSEINFO& info) {
    if (info.nFolder == 0 || _isSlash(info.pFolder[info.nFolder - 1]) || info.nStem + info.nExtension == 0) return 0;
    if (const wchar_t c = FirstSeparator(info.pRoot, info.nRoot)) return c;
    if (const wchar_t c = FirstSeparator(info.pFolder, info.nFolder)) return c;
    return L'/';
}

// --- straight paths -------------------------------------------------------------------------------------------------

bool IsForbidden(wchar_t c) {
    if (c < 0x20 || (c >= 0x7F && c < 0xA0)) return true;
    for (const wchar_t forbidden : {L'*', L'?', L'"', L'<', L'>', L'|'})
        if (c == forbidden) return true;
    return false;
}

// Whether each component of the text is a proper name; one separator may stand at its end.
bool HasStraightComponents(const wchar_t* text, std::size_t length, bool colons) {
    std::size_t start = 0;
    for (std::size_t i = 0; i <= length; ++i) {
        if (i < length && !_isSlash(text[i])) {
            if (IsForbidden(text[i]) || (text[i] == L':' && !colons)) return false;
            continue;
        }
        if (i == start) return i == length; // an empty component, unless it is what follows the last separator
        if (text[i - 1] == L'.' || text[i - 1] == L' ') return false; // "." and ".." too
        start = i + 1;
    }
    return true;
}

} // namespace

bool FU_ParsePath(const wchar_t* path, tagPATHPARSEINFO& info) noexcept {
    info = {};
    const std::size_t length = LengthOf(path);
    if (length == 0) return false;
    info.pRoot = path;
    info.eRoot = MatchRoot(path, info.nRoot);
    std::size_t name = length;
    while (name > info.nRoot && !_isSlash(path[name - 1])) --name;
    info.pFolder = path + info.nRoot;
    info.nFolder = name - info.nRoot;
    info.pStem = path + name;
    info.nStem = StemLength(info.pStem, length - name);
    info.pExtension = info.pStem + info.nStem;
    info.nExtension = length - name - info.nStem;
    return true;
}

bool FU_ParsePath(const wchar_t* path, tagCPATHPARSEINFO& info) noexcept {
    const std::size_t length = LengthOf(path);
    Scratch copy(length); // since the path may be one of the record's own texts
    if (copy.Get()) copy.Append(path, length);
    tagPATHPARSEINFO parts;
    const bool ok = FU_ParsePath(copy.Get(), parts) && Assign(info.sRoot, parts.pRoot, parts.nRoot) &&
                    Assign(info.sFolder, parts.pFolder, parts.nFolder) &&
                    Assign(info.sStem, parts.pStem, parts.nStem) &&
                    Assign(info.sExtension, parts.pExtension, parts.nExtension);
    info.eRoot = parts.eRoot;
    if (!ok) info = {};
    return ok;
}

String::CACFWChar FU_FormatPath(const tagPATHPARSEINFO& info) noexcept {
    Scratch path(info.nRoot + info.nFolder + info.nStem + info.nExtension + 2);
    if (!path.Get()) return {};
    path.Append(info.pRoot, info.nRoot);
    path.Append(info.pFolder, info.nFolder);
    if (const wchar_t separator = MissingSeparator(info)) path.Append(separator);
    path.Append(info.pStem, info.nStem);
    if (info.nExtension > 0 && info.pExtension[0] != L'.') path.Append(L'.');
    path.Append(info.pExtension, info.nExtension);
    return String::CACFWChar(static_cast<const wchar_t*>(path.Get()));
}

String::CACFWChar FU_FormatPath(const tagCPATHPARSEINFO& info) noexcept {
    tagPATHPARSEINFO parts;
    parts.pRoot = *info.sRoot;
    parts.nRoot = LengthOf(parts.pRoot);
    parts.pFolder = *info.sFolder;
    parts.nFolder = LengthOf(parts.pFolder);
    parts.pStem = *info.sStem;
    parts.nStem = LengthOf(parts.pStem);
    parts.pExtension = *info.sExtension;
    parts.nExtension = LengthOf(parts.pExtension);
    return FU_FormatPath(parts);
}

bool FU_CreatePath(const wchar_t* path) noexcept {
    std::size_t root;
    const std::size_t length = LengthOf(path);
    if (length == 0) return false;
    if (OS::_TestDirExists(path)) return true;
    MatchRoot(path, root);
    Scratch folder(length);
    if (!folder.Get()) return false;
    folder.Append(path, length);
    // Cuts the text behind one component after the other. A folder that another process made meanwhile serves as well.
    for (std::size_t i = root; i < length; ++i) {
        const bool atEnd = i + 1 == length || _isSlash(path[i + 1]);
        if (_isSlash(path[i]) || !atEnd) continue;
        const wchar_t separator = path[i + 1];
        folder.Get()[i + 1] = 0;
        if (!OS::_TestDirExists(folder.Get()) && !OS::_CreateDir(folder.Get()) && !OS::_TestDirExists(folder.Get()))
            return false;
        folder.Get()[i + 1] = separator;
    }
    return OS::_TestDirExists(path);
}

bool FU_IsStraightPath(const wchar_t* path) noexcept {
    const std::size_t length = LengthOf(path);
    if (length == 0) return false;
    std::size_t root;
    const ePathRoot kind = MatchRoot(path, root);
    // A root's own separators and the '?' or '.' of a device are its form, the rest are components like any other.
    constexpr std::size_t kForm[] = {0, 1, 0, 0, 2, 4};
    return HasStraightComponents(path + kForm[kind], root - kForm[kind], true) &&
           HasStraightComponents(path + root, length - root, false);
}

} // namespace TAVO::Files
