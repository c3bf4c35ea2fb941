// Static objects of a plug-in, made when it is loaded and ended when it is unloaded, both times with the pool at hand.

#include "pool.h"

#include <TAVO/string.h>

namespace {

struct Static {
    TAVO::String::CPPoolString text{plugin::kHeldText};
    const wchar_t** late = nullptr;
    ~Static() {
        const TAVO::String::CPPoolString interned(plugin::kLateText);
        if (late) *late = interned;
    }
} g_static;

} // namespace

extern "C" TAVO_EXPORT const wchar_t* TavoTestHeldEntry(const wchar_t** late) {
    g_static.late = late;
    return g_static.text;
}
