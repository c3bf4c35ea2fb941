// 3F does not bring every block back; 3FFF does.

#include "contract.h"

#include <cstring>
#include <TAVO/string.h>

namespace contract {

using namespace TAVO::String;
using TAVO::Buffers::CPPlainMemory;

static bool Equal(const CPPlainMemory& memory, const void* bytes, std::size_t size) {
    return memory.GetSize() == size && std::memcmp(memory, bytes, size) == 0;
}

void BytesAsText() {
    const unsigned char block[] = {0x00, 0x0E, 0x07};
    const CPPlainMemory two = C3FDecoder(CPPoolString(C3FEncoder(block, 2)));
    Is("3F reads 00 0E back as 00 FE", Equal(two, "\x00\xFE", 2));
    Is("and refuses three bytes", CPPlainMemory(C3FDecoder(CPPoolString(C3FEncoder(block, 3)))).GetSize() == 0);
    Instead("3FFF brings both back", Equal(C3FFFDecoder(CPPoolString(C3FFFEncoder(block, 2))), block, 2) &&
                                         Equal(C3FFFDecoder(CPPoolString(C3FFFEncoder(block, 3))), block, 3));

    const unsigned char seven[7] = {};
    C3FFFEncoder encoder(seven, sizeof seven);
    wchar_t text[16];
    IStringSubmitter& submitter = encoder;
    Is("seven bytes announce four units too many", submitter.GetStringLen() == 9 && CPPoolString(encoder).len() == 5);
    Instead("the terminator tells", submitter.GetString(text) && text[4] != 0 && text[5] == 0);
}

} // namespace contract
