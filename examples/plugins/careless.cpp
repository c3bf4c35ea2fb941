// A plug-in that is wrong on purpose: it leaves without taking its class out of the registry.

#include "clip_tool.h"

using namespace TAVO::ACF;

extern "C" TAVO_EXPORT TAVO::long32 TAVOPluginRegister(IACFComponentFactory*) {
    constexpr _acfUID kForgotten = {0xBE55B5D2, 0xFB4E, 0x4D1E, {0x9F, 0x0B, 0x4D, 0x3D, 0x6E, 0xD0, 0x8C, 0x61}};
    const bool entered = CPIACFUnknown::Factory_RegisterClass(kForgotten, {}, L"Forgotten",
                                                              [](const _acfUID&) { return CPIACFUnknown(); });
    return entered ? acfOk : acfFail;
}

extern "C" TAVO_EXPORT TAVO::long32 TAVOPluginUnregister() { return acfOk; }
