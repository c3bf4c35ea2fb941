#pragma once
// The ways to open a file that matter for sharing, and what the rules say about two of them at once.

#include <TAVO/files.h>

namespace support {

// Kind 0 to 7: bit 0 writes, bit 1 lets others write, bit 2 lets others read.
constexpr unsigned kSharingKinds = 8;

inline bool OpenAsKind(TAVO::Files::OS::CFile& file, const wchar_t* path, unsigned kind) {
    using namespace TAVO::Files::OS;
    const auto access = (kind & 1 ? FileAccessWrite : FileAccessRead) |
                        (kind & 2 ? FileAccessShareWrite : FileAccessRead) |
                        (kind & 4 ? FileAccessShareRead : FileAccessRead);
    return file.Open(path, access, OpenFileExisting);
}

// One bit per kind that may be opened beside `held`: each must let the other in by what it shares. Everyone reads.
inline unsigned KindsThatMayMeet(unsigned held) {
    unsigned mask = 0;
    for (unsigned kind = 0; kind < kSharingKinds; ++kind)
        if (held & kind & 4 && (!(kind & 1) || held & 2) && (!(held & 1) || kind & 2)) mask |= 1u << kind;
    return mask;
}

// One bit per kind that can be opened now.
inline unsigned KindsThatOpen(const wchar_t* path) {
    unsigned mask = 0;
    for (unsigned kind = 0; kind < kSharingKinds; ++kind) {
        TAVO::Files::OS::CFile file;
        if (OpenAsKind(file, path, kind)) mask |= 1u << kind;
    }
    return mask;
}

// The same, asked by another process.
unsigned KindsThatOpenElsewhere(const wchar_t* path);

} // namespace support
