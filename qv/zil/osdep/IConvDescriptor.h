// One iconv conversion descriptor, borrowed for the lifetime of this object. Opening a
// descriptor costs far more than converting a short text, so returned descriptors are kept
// in a small process-wide cache (a few per process, each lent to one owner at a time) and
// handed out again for the same pair of character sets under the same locale character
// set. A descriptor comes back reset to its initial shift state. The cache is emptied when
// the program or the library that holds it is unloaded; a descriptor given back after that
// is simply closed.
#pragma once

#include <iconv.h>

namespace qv {
namespace zil {
namespace osdep {

class IConvDescriptor {
public:
    // A descriptor converting from `from` into `to`, where "" names the calling thread's
    // locale's character set. Throws InvalidLocale when iconv knows no such conversion.
    IConvDescriptor(const char* to, const char* from);
    ~IConvDescriptor();
    IConvDescriptor(const IConvDescriptor&) = delete;
    IConvDescriptor& operator=(const IConvDescriptor&) = delete;

    iconv_t Get() const { return m_descriptor; }

    // Descriptors the cache holds now (for tests).
    static unsigned CachedCount();

private:
    struct Key {
        char to[32];
        char from[32];
        char localeCharset[32];
    };
    struct Cache;
    static bool MakeKey(const char* to, const char* from, Key& key);

    iconv_t m_descriptor;
    bool m_bCacheable;
    Key m_key;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
