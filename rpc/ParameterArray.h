// Reference-counted holder of an array of narrow strings, shared by the messages that
// carry it. The count changes only by atomic increments and decrements, so holders may
// be released on different threads; the strings themselves are used by one thread at a
// time. Releasing the last reference destroys the strings, the array and the holder; a
// holder whose array was detached destroys only itself, which lets a request refer to
// its caller's strings without owning them. Creating one may throw std::bad_alloc.
#pragma once

#include <atomic>
#include <cstdint>

#include "qv/zil/StringBase.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

class ParameterArray {
public:
    // A holder with one reference that owns a new array of count empty strings (no
    // array at all for a count of 0).
    static ParameterArray* Create(uint32_t count);
    // A holder with one reference over the caller's array; Detach it before Release.
    static ParameterArray* Borrow(zil::ByteString* strings, uint32_t count);

    ParameterArray(const ParameterArray&) = delete;
    ParameterArray& operator=(const ParameterArray&) = delete;

    void AddRef();
    void Release();
    // Clears the array pointer so that the last Release destroys the holder only.
    void Detach();

    zil::ByteString* Strings() const { return m_pStrings; }
    uint32_t Count() const { return m_pStrings ? m_nCount : 0; }

private:
    ParameterArray(zil::ByteString* strings, uint32_t count, bool owned);
    ~ParameterArray();

    std::atomic<uint32_t> m_nRefCount;
    zil::ByteString* m_pStrings;
    uint32_t m_nCount;
    bool m_bOwned;
};

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
