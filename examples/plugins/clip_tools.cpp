// A plug-in with two classes: one counts the clips of a timeline, the other renames them.

#include "clip_tool.h"

#include <atomic>

using namespace TAVO::ACF;
using TAVO::String::CPPoolString;
using TAVO::XML::CPXMLObject;

namespace {

constexpr _acfUID kStatistics = {0x2E95A6F4, 0xBEF3, 0x4F45, {0x9C, 0x1A, 0x6E, 0xD9, 0x9B, 0xC5, 0x70, 0x26}};
constexpr _acfUID kRenamer = {0x4C3C7C2F, 0x50EE, 0x4FD0, {0x8F, 0x0A, 0xAF, 0x30, 0x4D, 0x3C, 0xE3, 0xA1}};

std::atomic<int> g_objects{0}; // while it is not 0, this code must stay

// Calls `visit` for every clip of every bin.
template <class Visit> void ForEachClip(const CPXMLObject& document, Visit visit) {
    const CPPoolString binName = L"bin", clipName = L"clip";
    const CPXMLObject* bins = document.FindFirstElement(L"bins");
    for (const CPXMLObject* bin = nullptr; bins && (bin = bins->FindNextElement(binName, bin)) != nullptr;)
        for (const CPXMLObject* clip = nullptr; (clip = bin->FindNextElement(clipName, clip)) != nullptr;) visit(*clip);
}

template <class Tool> class CClipTool : public CComponent<Tool, IClipTool> {
protected:
    CClipTool() { ++g_objects; }
    ~CClipTool() { --g_objects; }
};

class CStatistics final : public CClipTool<CStatistics> {
public:
    acfResult ACF_CALL Run(const CPXMLObject* document, const CPPoolString*, CPXMLObject* report) override {
        if (!document || !report || !report->SetName(L"statistics")) return acfInvalidArgument;
        const CPPoolString name = L"name", rate = L"rate";
        int clips = 0;
        TAVO::String::CPPoolStringArray rates(true); // sorted, without duplicates
        CPPoolString longest = CPPoolString::pempty;
        ForEachClip(*document, [&](const CPXMLObject& clip) {
            ++clips;
            rates.Add(clip.FindAttribute(rate));
            const CPPoolString one = clip.FindAttribute(name);
            if (one.len() > longest.len()) longest = one;
        });
        report->AddAttribute(L"clips", CPPoolString(clips));
        report->AddAttribute(L"rates", rates.Flatten(L' '));
        report->AddAttribute(L"longestName", longest);
        return acfOk;
    }
};

class CRenamer final : public CClipTool<CRenamer> {
public:
    acfResult ACF_CALL Run(const CPXMLObject* document, const CPPoolString* argument, CPXMLObject* report) override {
        if (!document || !argument || !report || !report->SetName(L"renamed")) return acfInvalidArgument;
        const CPPoolString name = L"name";
        int clips = 0;
        ForEachClip(*document, [&](CPXMLObject clip) { // a handle of its own, which shares the node
            if (clip.SprintfAttribute(name, L"%ls %ls", static_cast<const wchar_t*>(*argument),
                                      static_cast<const wchar_t*>(clip.FindAttribute(name))))
                ++clips;
        });
        report->AddAttribute(L"clips", CPPoolString(clips));
        return acfOk;
    }
};

const struct {
    _acfUID cls;
    const wchar_t* names;
    CPIACFUnknown::CreateFunction create;
} kClasses[] = {
    {kStatistics, L"Clip statistics;statistics", [](const _acfUID&) { return CStatistics::Make(); }},
    {kRenamer, L"Clip renamer;renamer", [](const _acfUID&) { return CRenamer::Make(); }},
};

} // namespace

extern "C" TAVO_EXPORT TAVO::long32 TAVOPluginUnregister() {
    if (g_objects != 0) return acfFail;
    for (const auto& one : kClasses) CPIACFUnknown::Factory_UnregisterClass(one.cls);
    return acfOk;
}

extern "C" TAVO_EXPORT TAVO::long32 TAVOPluginRegister(IACFComponentFactory*) {
    for (const auto& one : kClasses)
        if (!CPIACFUnknown::Factory_RegisterClass(one.cls, kClipTools, one.names, one.create)) {
            TAVOPluginUnregister();
            return acfFail;
        }
    return acfOk;
}
