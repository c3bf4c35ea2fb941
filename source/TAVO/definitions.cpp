// The library's own definition registry: the registered classes, seen through the framework's interfaces.

#include "classregistry.h"
#include "wide.h"

#include <atomic>

namespace TAVO::ACF {

namespace {

using Buffers::CPOMVector;

class CDefinition final : public CComponent<CDefinition, IACFDefinition> {
public:
    explicit CDefinition(const ClassRecord& record) noexcept : m_record(record) {}

    acfResult ACF_CALL GetIdentifier(eACFDefinitionId which, _acfUID* out) override {
        if (!out) return acfInvalidArgument;
        *out = which == acfIdClass ? m_record->cls : which == acfIdCategory ? m_record->category : _acfUID{};
        return which <= acfIdInterface ? acfOk : acfInvalidArgument;
    }

    acfResult ACF_CALL GetText(eACFDefinitionText which, wchar_t* buffer, std::uint64_t capacity,
                               std::uint64_t* needed) override {
        // Who registers a class tells its names only.
        const wchar_t* const text = which == acfTextNames ? static_cast<const wchar_t*>(m_record->names) : L"";
        const std::uint64_t units = String::detail::WideLength(text) + 1;
        const bool valid = which <= acfTextModule && (buffer || capacity == 0);
        if (needed) *needed = valid ? units : 0;
        if (!valid) return acfInvalidArgument;
        if (capacity == 0) return acfEnd;
        const std::uint64_t copied = units < capacity ? units : capacity;
        String::detail::WideCopy(buffer, text, copied - 1);
        buffer[copied - 1] = 0;
        return copied == units ? acfOk : acfEnd;
    }

private:
    const ClassRecord m_record;
};

// Writes an interface of a new component, with its reference; the component is empty without memory.
template <class I> acfResult Hand(CPIACFUnknown&& component, I** out) noexcept {
    IACFUnknown* given = nullptr;
    CPACI<I>(component).QueryRawInterface(&given);
    *out = static_cast<I*>(given);
    return given ? acfOk : acfFail;
}

class CEnumDefinitions final : public CComponent<CEnumDefinitions, IACFEnumDefinitions> {
public:
    explicit CEnumDefinitions(const CPOMVector& records) noexcept : m_records(records) {}

    acfResult ACF_CALL Next(IACFDefinition** out) override {
        if (!out) return acfInvalidArgument;
        *out = nullptr;
        std::size_t next = m_next.load();
        do
            if (next >= m_records.GetNItems()) return acfEnd;
        while (!m_next.compare_exchange_weak(next, next + 1));
        return Hand(CDefinition::Make(ClassRecord(m_records[next])), out);
    }
    acfResult ACF_CALL Reset() override {
        m_next = 0;
        return acfOk;
    }
    std::uint32_t ACF_CALL GetCount() override { return static_cast<std::uint32_t>(m_records.GetNItems()); }

private:
    const CPOMVector m_records;
    std::atomic<std::size_t> m_next{0};
};

class CDefinitionRegistry final : public CComponent<CDefinitionRegistry, IACFDefinitionRegistry> {
public:
    constexpr CDefinitionRegistry() noexcept : CComponent(false) {}

    acfResult ACF_CALL EnumDefinitions(const _acfUID& category, IACFEnumDefinitions** out) override {
        if (!out) return acfInvalidArgument;
        *out = nullptr;
        CPOMVector records;
        return classes::List(category, records) ? Hand(CEnumDefinitions::Make(records), out) : acfFail;
    }
    acfResult ACF_CALL FindDefinition(const _acfUID& cls, IACFDefinition** out) override {
        if (!out) return acfInvalidArgument;
        *out = nullptr;
        const ClassRecord record = classes::Find(cls);
        return record ? Hand(CDefinition::Make(record), out) : acfClassNotAvailable;
    }
    acfResult ACF_CALL FindClass(const wchar_t* name, _acfUID* cls) override {
        if (!cls) return acfInvalidArgument;
        const ClassRecord record = classes::FindNamed(name);
        *cls = record ? record->cls : _acfUID{};
        return record ? acfOk : acfClassNotAvailable;
    }
};

constinit CDefinitionRegistry g_definitions;

} // namespace

IACFDefinitionRegistry* CPIACFUnknown::Factory_GetRegistry() noexcept { return &g_definitions; }

} // namespace TAVO::ACF
