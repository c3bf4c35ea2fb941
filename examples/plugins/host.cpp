// A host with plug-ins: loads the libraries of a folder, lists their classes, hands a document to their components, and
// unloads them again.
//
//     example_host plugins examples/data/timeline.xml
//
// The order of ending is what matters: first the objects, then the plug-ins, then the factory, then AppExit. Code must
// outlive what it made.

#include "clip_tool.h"
#include "library.h"

#include <cstdio>
#include <memory>
#include <mutex>
#include <TAVO/core.h>
#include <TAVO/files.h>
#include <utility>
#include <vector>

using namespace TAVO::ACF;
using namespace TAVO::XML;
using TAVO::String::CACFWChar;
using TAVO::String::CPPoolString;
using TAVO::String::CUTF8Char;

namespace {

bool g_fine = true;

void Expect(bool condition, const char* what) {
    if (condition) return;
    std::printf("WRONG: %s\n", what);
    g_fine = false;
}

struct Shown {
    CUTF8Char text;
    explicit Shown(const wchar_t* wide) : text(wide) {}
    operator const char*() const { return text ? reinterpret_cast<const char*>(*text) : ""; }
};

// Serves the classes that plug-ins registered with the library, and the library's list of them.
class CHostFactory final : public CComponent<CHostFactory, IACFComponentFactory, IACFDefinitionRegistry> {
public:
    // The one shared object of the class, kept until Trim.
    acfResult ACF_CALL CreateComponent(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                       IACFUnknown** out) override {
        if (!out) return acfInvalidArgument;
        *out = nullptr;
        if (outer) return acfNoAggregation;
        CPIACFUnknown component = Kept(cls);
        if (!component) {
            CPIACFUnknown made; // created without the lock: the class may need components itself
            if (!CPIACFUnknown::Factory_CreateClass(cls, made)) return acfClassNotAvailable;
            component = Keep(cls, std::move(made));
        }
        return Hand(component, type, out);
    }

    acfResult ACF_CALL CreateInstance(const _acfUID& cls, IACFUnknown* outer, const _acfUID& type,
                                      IACFUnknown** out) override {
        if (!out) return acfInvalidArgument;
        *out = nullptr;
        if (outer) return acfNoAggregation;
        CPIACFUnknown made;
        return CPIACFUnknown::Factory_CreateClass(cls, made) ? Hand(made, type, out) : acfClassNotAvailable;
    }

    acfResult ACF_CALL EnumDefinitions(const _acfUID& category, IACFEnumDefinitions** out) override {
        return CPIACFUnknown::Factory_GetRegistry()->EnumDefinitions(category, out);
    }
    acfResult ACF_CALL FindDefinition(const _acfUID& cls, IACFDefinition** out) override {
        return CPIACFUnknown::Factory_GetRegistry()->FindDefinition(cls, out);
    }
    acfResult ACF_CALL FindClass(const wchar_t* name, _acfUID* cls) override {
        return CPIACFUnknown::Factory_GetRegistry()->FindClass(name, cls);
    }

    // Drops the components that nobody else holds.
    void Trim() {
        std::vector<Component> dropped, kept; // dropped ones end when the lock is left
        const std::lock_guard<std::mutex> lock(m_mutex);
        for (Component& one : m_components) (one.object.GetLockCount() == 1 ? dropped : kept).push_back(std::move(one));
        m_components = std::move(kept);
    }

private:
    struct Component {
        cacfuid cls;
        CPIACFUnknown object;
    };

    static acfResult Hand(const CPIACFUnknown& object, const _acfUID& type, IACFUnknown** out) {
        return IPACF(type, Raw(object)).QueryRawInterface(out) ? acfOk : acfNoInterface;
    }
    // The pointer alone; the wrapper keeps its reference.
    static IACFUnknown* Raw(const CPIACFUnknown& object) {
        IACFUnknown* pointer = nullptr;
        if (object.QueryRawInterface(&pointer)) pointer->Release();
        return pointer;
    }

    CPIACFUnknown Kept(const cacfuid& cls) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        for (const Component& one : m_components)
            if (one.cls == cls) return one.object;
        return {};
    }
    // The first one kept wins, when two threads made one at the same time.
    CPIACFUnknown Keep(const cacfuid& cls, CPIACFUnknown made) {
        const std::lock_guard<std::mutex> lock(m_mutex);
        for (const Component& one : m_components)
            if (one.cls == cls) return one.object;
        m_components.push_back({cls, made});
        return made;
    }

    std::mutex m_mutex;
    std::vector<Component> m_components;
};

std::vector<cacfuid> Classes(const _acfUID& category = {}) {
    std::vector<cacfuid> classes;
    CPACI<IACFEnumDefinitions> list;
    if (!CPIACFUnknown::Factory_EnumDefinitions(category, list)) return classes;
    for (IACFDefinition* definition; list->Next(&definition) == acfOk; definition->Release()) {
        cacfuid cls;
        if (definition->GetIdentifier(acfIdClass, &cls.rec()) == acfOk) classes.push_back(cls);
    }
    return classes;
}

bool Contains(const std::vector<cacfuid>& classes, const cacfuid& cls) {
    for (const cacfuid& one : classes)
        if (one == cls) return true;
    return false;
}

// One loaded library.
class CPlugin {
public:
    bool Load(const CACFWChar& name, const CACFWChar& path, IACFComponentFactory* host) {
        m_name = name;
        if (!m_library.Load(path)) return Refuse("cannot be loaded");
        const auto enter = reinterpret_cast<PluginRegister>(m_library.Find(kPluginRegister));
        m_leave = reinterpret_cast<PluginUnregister>(m_library.Find(kPluginUnregister));
        const std::vector<cacfuid> before = Classes();
        if (!enter || !m_leave || enter(host) < 0) {
            m_library.Unload();
            return Refuse("is no plug-in, or could not enter its classes");
        }
        for (const cacfuid& cls : Classes())
            if (!Contains(before, cls)) m_classes.push_back(cls);
        std::printf("loaded %s: %zu classes\n", static_cast<const char*>(Shown(m_name)), m_classes.size());
        return true;
    }

    // False, and the plug-in stays, while objects of it live. What it forgot is told and put right: a class whose code
    // is gone would crash whoever creates it. `forgotten` counts those.
    bool Unload(CHostFactory& factory, int& forgotten) {
        factory.Trim();
        if (m_leave() < 0) return Refuse("stays loaded: objects of it live");
        const std::vector<cacfuid> left = Classes();
        for (const cacfuid& cls : m_classes) {
            if (!Contains(left, cls)) continue;
            std::printf("%s forgot to unregister %s\n", static_cast<const char*>(Shown(m_name)),
                        static_cast<const char*>(Shown(static_cast<CACFWChar>(cls))));
            CPIACFUnknown::Factory_UnregisterClass(cls);
            ++forgotten;
        }
        m_library.Unload();
        std::printf("unloaded %s\n", static_cast<const char*>(Shown(m_name)));
        return true;
    }

private:
    bool Refuse(const char* why) const {
        std::printf("%s %s\n", static_cast<const char*>(Shown(m_name)), why);
        return false;
    }

    CACFWChar m_name;
    CLibrary m_library;
    PluginUnregister m_leave = nullptr;
    std::vector<cacfuid> m_classes;
};

using Plugins = std::vector<std::unique_ptr<CPlugin>>;

Plugins LoadFolder(const CACFWChar& folder, IACFComponentFactory* host) {
    Plugins plugins;
    TAVO::Files::OS::CDirectoryEnumerator files;
    TAVO::Files::OS::CFindData file;
    if (!files.BeginEnumerate(folder, CLibrary::Pattern(), false)) return plugins;
    while (files.GetNext(file)) {
        auto plugin = std::make_unique<CPlugin>();
        TAVO::Files::tagCPATHPARSEINFO path;
        path.sFolder = folder;
        path.sStem = file.GetFilename();
        if (plugin->Load(file.GetFilename(), TAVO::Files::FU_FormatPath(path), host))
            plugins.push_back(std::move(plugin));
    }
    return plugins;
}

// Creates a tool and runs it; the report, or an empty handle.
CPXMLObject RunTool(const cacfuid& cls, const CPXMLObject& document, const CPPoolString& argument) {
    CPXMLObject report;
    CPACI<IClipTool> tool;
    Expect(tool.createInstance(cls), "a registered class can be created");
    if (!tool || tool->Run(&document, &argument, &report) != acfOk) return {};
    Expect(tool.GetLockCount() == 1, "a new object has one holder");
    Expect(report.IsType(CPXMLObject::GetTypeID()), "elements of a plug-in are elements here");
    std::printf("  %s:", static_cast<const char*>(Shown(report.GetName())));
    CPPoolString name, value;
    for (std::size_t i = 0; report.GetAttribute(i, name, value); ++i)
        std::printf(" %s=\"%s\"", static_cast<const char*>(Shown(name)), static_cast<const char*>(Shown(value)));
    std::printf("\n");
    return report;
}

void UseTools(const CPXMLObject& document) {
    for (const cacfuid& cls : Classes(kClipTools)) {
        COMPONENT_INFO info;
        Expect(CPIACFUnknown::Factory_GetComponentInfo(cls, info), "a listed class is known");
        std::printf("%s %s\n", static_cast<const char*>(Shown(static_cast<CACFWChar>(cls))),
                    static_cast<const char*>(Shown(info.sName)));
        Expect(static_cast<bool>(RunTool(cls, document, L"Ferry")), "the tool runs");
    }
    cacfuid statistics;
    Expect(CPIACFUnknown::Factory_FindClass(L"STATISTICS", statistics), "a class is found by any of its names");
    CPACI<IClipTool> first, second;
    Expect(first.createComponent(statistics) && second.createComponent(statistics) && first == second,
           "a component exists once");
}

} // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::puts("give a folder of plug-ins and a timeline document");
        return 2;
    }
    TAVO::AppInit();
    {
        CXMLDoc document;
        Expect(document.OpenDocFile(CACFWChar(argv[2]), XMLEncodingAutomatic), "the document can be read");
        const CPXMLObject root = document.GetRootElement();

        CPACI<IACFComponentFactory> factory(CHostFactory::Make());
        auto& host = static_cast<CHostFactory&>(*factory.Get());
        Expect(CPIACFUnknown::Factory_Set(factory.Get()), "the factory can be set");

        Plugins plugins = LoadFolder(CACFWChar(argv[1]), factory.Get());
        Expect(plugins.size() == 3, "all plug-ins were loaded");
        UseTools(root);

        // A plug-in with an object in use stays.
        int forgotten = 0;
        {
            cacfuid cls;
            CPIACFUnknown::Factory_FindClass(L"renamer", cls);
            CPACI<IClipTool> used;
            used.createComponent(cls);
            Plugins left;
            for (auto& plugin : plugins)
                if (!plugin->Unload(host, forgotten)) left.push_back(std::move(plugin));
            plugins = std::move(left);
            Expect(plugins.size() == 1 && used, "the plug-in of a living object stays loaded");
        }
        for (auto& plugin : plugins) Expect(plugin->Unload(host, forgotten), "a plug-in without objects goes");
        Expect(forgotten == 1, "the careless plug-in was found out");
        Expect(Classes().empty(), "no class is left");

        // What plug-ins made of the library's values outlives them.
        const CPXMLObject* clip = root.FindFirstElement(L"bins/bin/clip");
        const CPPoolString renamed = clip ? clip->FindAttribute(L"name") : CPPoolString();
        std::printf("the first clip is now \"%s\"\n", static_cast<const char*>(Shown(renamed)));
        Expect(renamed.cmpp(L"Ferry ") == 0, "the clips were renamed");

        CPIACFUnknown::Factory_Release();
        Expect(!CPIACFUnknown::Factory_IsAvailable() && factory.GetLockCount() == 1, "nobody else holds the factory");
    }
    TAVO::AppExit();
    return g_fine ? 0 : 1;
}
