// The base of components and of static class factories.

#include <TAVO/acf.h>

namespace TAVO::ACF {

// --- _cACFUnknown ----------------------------------------------------------------------------------------------------

acfResult ACF_CALL _cACFUnknown::QueryInterface(const _acfUID& type, IACFUnknown** out) {
    if (!out) return acfInvalidArgument;
    *out = nullptr;
    try {
        *out = _queryinterfaceadd(type);
    } catch (...) {
    }
    return *out ? acfOk : acfNoInterface;
}

std::uint32_t ACF_CALL _cACFUnknown::AddRef() { return _addRef(); }
std::uint32_t ACF_CALL _cACFUnknown::Release() { return _release(); }

IACFUnknown* _cACFUnknown::_queryinterface(const _acfUID& type) {
    const bool answered =
        acfIsSame(type, acfTypeOf<IACFUnknown>::uid) || acfIsSame(type, acfTypeOf<IACFComponent>::uid);
    return answered ? this : nullptr;
}

IACFUnknown* _cACFUnknown::_queryinterfaceadd(const _acfUID& type) {
    IACFUnknown* const found = _queryinterface(type);
    if (found) _addRef();
    return found;
}

void _cACFUnknown::End() noexcept {
    try {
        destroy();
    } catch (...) {
    }
}

// --- _csFactory ------------------------------------------------------------------------------------------------------

acfResult ACF_CALL _csFactory::QueryInterface(const _acfUID& type, IACFUnknown** out) {
    if (!out) return acfInvalidArgument;
    const bool answered =
        acfIsSame(type, acfTypeOf<IACFUnknown>::uid) || acfIsSame(type, acfTypeOf<IACFClassFactory>::uid);
    *out = answered ? this : nullptr;
    return answered ? acfOk : acfNoInterface;
}

// Intended (static-factory-counts): a static object is not counted, and says so by constants: 2 after AddRef, 0 after
// Release. A textbook would count; framework code that logs the counts would notice.
std::uint32_t ACF_CALL _csFactory::AddRef() { return 2; }
std::uint32_t ACF_CALL _csFactory::Release() { return 0; }

acfResult ACF_CALL _csFactory::CreateInstance(IACFUnknown*, IACFUnknown* outer, const _acfUID& type,
                                              IACFUnknown** out) {
    if (!out) return acfInvalidArgument;
    *out = nullptr;
    if (outer) return acfNoAggregation;
    try {
        if (Create(type, out) && *out) return acfOk;
    } catch (...) {
    }
    *out = nullptr;
    return acfClassNotAvailable;
}

} // namespace TAVO::ACF
