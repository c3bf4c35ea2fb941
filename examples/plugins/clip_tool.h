#pragma once
// What the host and its plug-ins agree on: one interface, and the category of classes that have it.

#include <TAVO/acf.h>
#include <TAVO/xml.h>

/// Looks at a timeline document, or changes it. Values of the library cross between modules as they are: host and
/// plug-ins share one TAVO, so a handle of one is a handle of the other.
struct IClipTool : IACFUnknown {
    /// @param argument  what the tool needs to be told; may be the null string
    /// @param report    gets an element that tells what was done
    virtual acfResult ACF_CALL Run(const TAVO::XML::CPXMLObject* document, const TAVO::String::CPPoolString* argument,
                                   TAVO::XML::CPXMLObject* report) = 0;
};
template <> struct acfTypeOf<IClipTool> {
    static constexpr _acfUID uid = {0x68A61F2B, 0xFEF9, 0x4CAC, {0xA1, 0x2C, 0x94, 0xCD, 0x39, 0xA0, 0x0E, 0x43}};
};

constexpr _acfUID kClipTools = {0xCBD9FBE5, 0xC351, 0x4C58, {0xBA, 0x5E, 0x8F, 0x4C, 0x14, 0x21, 0x7D, 0x90}};

/// What every plug-in exports. Register enters the plug-in's classes, Unregister takes them out; both answer a result
/// code. Unregister refuses, and changes nothing, while objects of the plug-in live.
using PluginRegister = TAVO::long32 (*)(IACFComponentFactory* host);
using PluginUnregister = TAVO::long32 (*)();
constexpr const char* kPluginRegister = "TAVOPluginRegister";
constexpr const char* kPluginUnregister = "TAVOPluginUnregister";
