#include "rpc/ParameterArray.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

ParameterArray::ParameterArray(zil::ByteString* strings, uint32_t count, bool owned)
    : m_nRefCount(1), m_pStrings(strings), m_nCount(count), m_bOwned(owned) {}

ParameterArray::~ParameterArray() {
    if (m_bOwned) {
        delete[] m_pStrings;
    }
}

ParameterArray* ParameterArray::Create(uint32_t count) {
    zil::ByteString* strings = count != 0 ? new zil::ByteString[count] : nullptr;
    try {
        return new ParameterArray(strings, count, true);
    } catch (...) {
        delete[] strings;
        throw;
    }
}

ParameterArray* ParameterArray::Borrow(zil::ByteString* strings, uint32_t count) {
    return new ParameterArray(strings, count, false);
}

void ParameterArray::AddRef() { m_nRefCount.fetch_add(1, std::memory_order_relaxed); }

void ParameterArray::Release() {
    if (m_nRefCount.fetch_sub(1, std::memory_order_acq_rel) == 1) {
        delete this;
    }
}

void ParameterArray::Detach() {
    m_pStrings = nullptr;
    m_nCount = 0;
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
