// Path texts: what is taken apart joins to the same text, and straight paths against a naive reading.
// Input: the units of a path, one byte each.

#include "require.h"

#include <algorithm>
#include <cstdint>
#include <string>
#include <TAVO/files.h>
#include <vector>

namespace {

using namespace TAVO::Files;

struct Root {
    ePathRoot kind;
    std::size_t length, form; // the form is what no component's rules hold for
};

// All separators are '/' here and letters are capitals.
std::size_t ShareEnd(const std::string& path, std::size_t server) {
    const auto share = path.find('/', server);
    if (share == path.npos || share == server || share + 1 == path.size() || path[share + 1] == '/') return 0;
    const auto end = path.find('/', share + 1);
    return end == path.npos ? path.size() : end + 1;
}

bool IsDriveAt(const std::string& path, std::size_t at, const char* rest) {
    return at < path.size() && path[at] >= 'A' && path[at] <= 'Z' &&
           path.compare(at + 1, std::string(rest).size(), rest) == 0;
}

Root RootOf(const std::string& path) {
    const std::string head = path.substr(0, 4);
    if (head == "//?/" || head == "//./") {
        if (path.compare(4, 4, "UNC/") == 0 && ShareEnd(path, 8)) return {PathRootDevice, ShareEnd(path, 8), 4};
        return {PathRootDevice, IsDriveAt(path, 4, ":/") ? 7u : 4u, 4};
    }
    if (path.compare(0, 2, "//") == 0 && ShareEnd(path, 2)) return {PathRootNetwork, ShareEnd(path, 2), 2};
    if (IsDriveAt(path, 0, ":/")) return {PathRootDrive, 3, 3};
    if (IsDriveAt(path, 0, ":")) return {PathRootDriveRelative, 2, 2};
    if (path.compare(0, 1, "/") == 0) return {PathRootRooted, 1, 1};
    return {PathRootNone, 0, 0};
}

bool IsStraightComponent(const std::string& name) {
    if (name.empty() || name.back() == '.' || name.back() == ' ') return false;
    return std::none_of(name.begin(), name.end(), [](unsigned char c) {
        return c < 0x20 || (c > 0x7E && c < 0xA0) || std::string("*?\"<>|").find(static_cast<char>(c)) < 6;
    });
}

bool IsStraight(const std::string& path, const Root& root) {
    if (path.empty() || path.find(':', root.length) != path.npos) return false;
    std::size_t at = root.form;
    while (at < path.size()) {
        const auto end = std::min(path.find('/', at), path.size());
        if (root.kind == PathRootDevice && end == 6 && root.length == 7) { // its drive
            at = end + 1;
            continue;
        }
        if (!IsStraightComponent(path.substr(at, end - at))) return false;
        at = end + 1;
    }
    return true;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<wchar_t> path;
    std::string plain;
    for (std::size_t i = 0; i < size && data[i]; ++i) {
        const char c = static_cast<char>(data[i]);
        path.push_back(data[i]);
        plain += c == '\\' ? '/' : c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
    }
    path.push_back(0);
    path.shrink_to_fit();

    const Root root = RootOf(plain);
    Require(FU_IsStraightPath(path.data()) == IsStraight(plain, root));
    tagPATHPARSEINFO parts;
    tagCPATHPARSEINFO texts;
    const bool any = !plain.empty();
    Require(FU_ParsePath(path.data(), parts) == any && FU_ParsePath(path.data(), texts) == any);
    Require(parts.eRoot == root.kind && texts.eRoot == root.kind && parts.nRoot == root.length);
    Require(parts.nRoot + parts.nFolder + parts.nStem + parts.nExtension == plain.size());
    for (const auto& joined : {FU_FormatPath(parts), FU_FormatPath(texts)})
        Require(joined && std::equal(path.begin(), path.end(), *joined));
    return 0;
}
