#include "qv/zil/osdep/IConvDescriptor.h"

#include <langinfo.h>

#include <cstring>
#include <mutex>

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace osdep {

namespace {

const iconv_t kNoDescriptor = reinterpret_cast<iconv_t>(-1);

// Copies text into a fixed field; false when it does not fit (such names are not cached).
template <size_t N>
bool CopyName(const char* text, char (&field)[N]) {
    const size_t length = std::strlen(text);
    if (length >= N) {
        return false;
    }
    std::memcpy(field, text, length + 1);
    return true;
}

}  // namespace

// The cache. Constant-initialised and trivially destructible, so it stays usable while
// other static objects are destroyed; once the closer has emptied it, `closed` keeps it
// empty and descriptors given back are closed at once.
struct IConvDescriptor::Cache {
    struct Entry {
        Key key;
        iconv_t descriptor;
    };
    static constexpr unsigned kCapacity = 8;

    std::mutex lock;
    Entry entries[kCapacity];
    unsigned count;
    bool closed;

    static Cache& Instance();
    iconv_t Take(const Key& key);
    bool Give(const Key& key, iconv_t descriptor);
    void Close();
};

IConvDescriptor::Cache& IConvDescriptor::Cache::Instance() {
    static Cache cache{};
    // Empties the cache when the program ends or this library is unloaded.
    struct Closer {
        ~Closer() { cache.Close(); }
    };
    static Closer closer;
    return cache;
}

iconv_t IConvDescriptor::Cache::Take(const Key& key) {
    std::lock_guard<std::mutex> guard(lock);
    for (unsigned i = count; i-- > 0;) {
        if (std::memcmp(&entries[i].key, &key, sizeof key) == 0) {
            const iconv_t descriptor = entries[i].descriptor;
            entries[i] = entries[--count];
            return descriptor;
        }
    }
    return kNoDescriptor;
}

bool IConvDescriptor::Cache::Give(const Key& key, iconv_t descriptor) {
    std::lock_guard<std::mutex> guard(lock);
    if (closed || count == kCapacity) {
        return false;
    }
    entries[count++] = Entry{key, descriptor};
    return true;
}

void IConvDescriptor::Cache::Close() {
    std::lock_guard<std::mutex> guard(lock);
    while (count > 0) {
        iconv_close(entries[--count].descriptor);
    }
    closed = true;
}

// The key holds the locale's character set too: "" and the names iconv completes from
// the locale mean different sets under different locales. Unused bytes are zero, so keys
// compare as whole blocks.
bool IConvDescriptor::MakeKey(const char* to, const char* from, Key& key) {
    std::memset(&key, 0, sizeof key);
    return CopyName(to, key.to) && CopyName(from, key.from) &&
           CopyName(nl_langinfo(CODESET), key.localeCharset);
}

IConvDescriptor::IConvDescriptor(const char* to, const char* from)
    : m_descriptor(kNoDescriptor), m_bCacheable(MakeKey(to, from, m_key)) {
    if (m_bCacheable) {
        m_descriptor = Cache::Instance().Take(m_key);
    }
    if (m_descriptor == kNoDescriptor) {
        m_descriptor = iconv_open(to, from);
    }
    if (m_descriptor == kNoDescriptor) {
        QV_THROW(exception::InvalidLocale());
    }
}

IConvDescriptor::~IConvDescriptor() {
    // Back to the initial shift state before anyone else converts with it.
    iconv(m_descriptor, nullptr, nullptr, nullptr, nullptr);
    if (!m_bCacheable || !Cache::Instance().Give(m_key, m_descriptor)) {
        iconv_close(m_descriptor);
    }
}

unsigned IConvDescriptor::CachedCount() {
    Cache& cache = Cache::Instance();
    std::lock_guard<std::mutex> guard(cache.lock);
    return cache.count;
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
