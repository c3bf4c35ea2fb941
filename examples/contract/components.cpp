// Identifiers, and wrappers of interface pointers.

#include "contract.h"

#include <TAVO/acf.h>

namespace contract {

using namespace TAVO::ACF;

namespace {

struct Part final : CComponent<Part> {};

} // namespace

void Components() {
    cacfuid id;
    Is("text without four dashes is the null identifier and no error", id.Set("no identifier"));
    Instead("test the identifier", !id);
    Is("braces are refused", !id.Set("{15603CD4-AB81-4D6F-B05F-C6BEA760A789}"));

    CPIACFUnknown wrapper;
    Is("creating from no factory is true", wrapper.createInstance(id, nullptr));
    Instead("test the wrapper", !wrapper);
    Is("without a factory of the process it is false", !wrapper.createInstance(id));

    const CPIACFUnknown part = Part::Make(), copy(part);
    Is("a copy queries the object, and both are the same", copy == part && part.GetLockCount() == 2);
}

} // namespace contract
