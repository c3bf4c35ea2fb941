// Vectors of handles of any type, and the set of one object per type.

#include "objectvector.h"

namespace TAVO::Buffers {

template class TAVO_TEMPLATE_DEF CPObjectVector<CPObjectMemory>;

CPOMVector::CPOMVector(const CPObjectMemory& other) noexcept { *this = other; }

CPOMVector& CPOMVector::operator=(const CPObjectMemory& other) noexcept {
    if (other.IsNAssignable(sizeof(CPObjectMemory), &_vtbl))
        CopyCPMemory(other);
    else
        free();
    return *this;
}

CPTypedObjectVector::~CPTypedObjectVector() = default;

std::size_t CPTypedObjectVector::Locate(std::size_t typeId, bool& found) const noexcept {
    const auto compare = [](const void* key, const void* element) {
        const std::size_t wanted = *static_cast<const std::size_t*>(key);
        const std::size_t here = static_cast<const CPObjectMemory*>(element)->GetTypeID();
        return wanted < here ? -1 : wanted > here;
    };
    std::size_t count;
    const CPObjectMemory* objects = m_objects.GetArray(count);
    const std::size_t position = Sort::vfqfind(&typeId, objects, count, sizeof(CPObjectMemory), compare);
    found = position < count && objects[position].GetTypeID() == typeId;
    return position;
}

bool CPTypedObjectVector::Set(const CPObjectMemory& object) noexcept {
    CPObjectMemory copy(object);
    // The set's own block may be shared with a copy of the set.
    if (!object.GetTypeID() || !copy.clone() || !m_objects.clone()) return false;
    bool found;
    const std::size_t position = Locate(copy.GetTypeID(), found);
    if (!found) return m_objects.Insert(copy, position);
    m_objects[position] = std::move(copy);
    return true;
}

CPObjectMemory CPTypedObjectVector::Get(std::size_t typeId) const noexcept {
    bool found;
    const std::size_t position = Locate(typeId, found);
    if (!found) return {};
    CPObjectMemory copy(m_objects[position]);
    return copy.clone() ? copy : CPObjectMemory();
}

bool CPTypedObjectVector::Delete(std::size_t typeId) noexcept {
    bool found;
    const std::size_t position = Locate(typeId, found);
    return !found || (m_objects.clone() && m_objects.Delete(position, true));
}

} // namespace TAVO::Buffers
