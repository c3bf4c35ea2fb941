#pragma once
// Calls of framework objects, which are somebody else's code: what they throw ends here.

#include <TAVO/acf.h>

namespace TAVO::ACF {

inline bool AddRefQuietly(IACFUnknown* object) noexcept {
    try {
        object->AddRef();
        return true;
    } catch (...) {
        return false;
    }
}

inline bool ReleaseQuietly(IACFUnknown* object) noexcept {
    try {
        object->Release();
        return true;
    } catch (...) {
        return false;
    }
}

// The process's factory for as long as it is used; null without one.
class AcquiredFactory {
public:
    AcquiredFactory() noexcept { CPIACFUnknown::Factory_Acquire(&m_factory); }
    AcquiredFactory(const AcquiredFactory&) = delete;
    AcquiredFactory& operator=(const AcquiredFactory&) = delete;
    ~AcquiredFactory() {
        if (m_factory) ReleaseQuietly(m_factory);
    }
    IACFComponentFactory* Get() const noexcept { return m_factory; }

private:
    IACFComponentFactory* m_factory = nullptr;
};

} // namespace TAVO::ACF
