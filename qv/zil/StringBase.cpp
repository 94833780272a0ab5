#include "qv/zil/StringBase.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <cwchar>
#include <new>
#include <utility>

#include "qv/zil/Exceptions.h"
#include "qv/zil/SafeInteger.h"
#include "qv/zil/StringCompare.h"
#include "qv/zil/Utf8ToWide.h"
#include "qv/zil/WideToUtf8.h"
#include "qv/zil/osdep/IConv.h"

namespace qv {
namespace zil {

namespace {

[[noreturn]] void ThrowOffsetOutOfRange() {
    QV_THROW(exception::OutOfRange2(ByteString("String offset out of range")));
}

[[noreturn]] void ThrowResultTooLarge() {
    QV_THROW(exception::BoundExceeded2(ByteString("Resulting string too large")));
}

// The number of elements of a NUL-terminated text; a null pointer is empty text.
template <typename E>
uint32_t TextLength(const E* text) {
    if (text == nullptr) {
        return 0;
    }
    const E* end = text;
    while (*end != E()) {
        ++end;
    }
    return SafeInteger::FromSigned(end - text);
}

// Bytes of a block that holds `elements` elements and the terminator.
template <typename E>
size_t BlockBytes(uint32_t elements) {
    return SafeInteger::Multiply(SafeInteger::Add(elements, 1), sizeof(E));
}

template <typename E>
bool Contains(const E* set, E element) {
    for (; set != nullptr && *set != E(); ++set) {
        if (*set == element) {
            return true;
        }
    }
    return false;
}

uint32_t Smaller(uint32_t a, uint32_t b) { return a < b ? a : b; }

}  // namespace

template <typename E>
StringBase<E>::StringBase(size_type capacity, Reserved)
    : m_pBegin(static_cast<E*>(std::malloc(BlockBytes<E>(capacity)))),
      m_pEnd(m_pBegin),
      m_pCapacityEnd(m_pBegin) {
    if (m_pBegin == nullptr) {
        throw std::bad_alloc();
    }
    m_pCapacityEnd += capacity;
    *m_pBegin = E();
}

// Once a delegated-to constructor has finished, the object owns its block: the
// destructor frees it when a constructor body below throws.
template <typename E>
StringBase<E>::StringBase() : StringBase(0, Reserved::kTag) {}

template <typename E>
StringBase<E>::StringBase(const E* text) : StringBase(text, TextLength(text)) {}

template <typename E>
StringBase<E>::StringBase(const E* data, size_type length)
    : StringBase(data == nullptr ? 0 : length, Reserved::kTag) {
    if (data == nullptr || length == 0) {
        return;
    }
    std::memcpy(m_pBegin, data, length * sizeof(E));
    m_pEnd = m_pBegin + length;
    *m_pEnd = E();
}

template <typename E>
StringBase<E>::StringBase(const StringBase& other) : StringBase(other.m_pBegin, other.size()) {}

template <typename E>
StringBase<E>& StringBase<E>::operator=(const StringBase& other) {
    return assign(other.m_pBegin, other.size());
}

template <typename E>
StringBase<E>::~StringBase() {
    Release();
}

template <typename E>
void StringBase<E>::Release() noexcept {
    std::free(m_pBegin);
    m_pBegin = m_pEnd = m_pCapacityEnd = nullptr;
}

template <typename E>
void StringBase<E>::swap(StringBase& other) noexcept {
    std::swap(m_pBegin, other.m_pBegin);
    std::swap(m_pEnd, other.m_pEnd);
    std::swap(m_pCapacityEnd, other.m_pCapacityEnd);
}

// Makes the block hold exactly n elements plus the terminator. The first min(size, n)
// elements survive; the caller sets the end and writes the terminator.
template <typename E>
void StringBase<E>::Reallocate(size_type n) {
    const size_type kept = Smaller(size(), n);
    void* block = std::realloc(m_pBegin, BlockBytes<E>(n));
    if (block == nullptr) {
        throw std::bad_alloc();
    }
    m_pBegin = static_cast<E*>(block);
    m_pEnd = m_pBegin + kept;
    m_pCapacityEnd = m_pBegin + n;
}

// Keeps the block while n <= capacity <= 2n; otherwise gives it exactly n elements.
template <typename E>
void StringBase<E>::ExactFit(size_type n) {
    const uint64_t currentCapacity = capacity();
    if (n <= currentCapacity && currentCapacity <= 2 * static_cast<uint64_t>(n)) {
        return;
    }
    Reallocate(n);
}

// Makes room for `added` more elements: 2n elements when that can be had, else exactly n.
template <typename E>
void StringBase<E>::GrowForAppend(size_type added) {
    const size_type needed = SafeInteger::Add(size(), added);
    if (needed <= capacity()) {
        return;
    }
    if (needed < 0x80000000u) {
        const uint64_t doubledBytes = (2 * static_cast<uint64_t>(needed) + 1) * sizeof(E);
        if (doubledBytes <= UINT32_MAX) {
            const size_type kept = size();
            void* block = std::realloc(m_pBegin, static_cast<size_t>(doubledBytes));
            if (block != nullptr) {
                m_pBegin = static_cast<E*>(block);
                m_pEnd = m_pBegin + kept;
                m_pCapacityEnd = m_pBegin + 2 * needed;
                return;
            }
        }
    }
    Reallocate(needed);
}

template <typename E>
StringBase<E>& StringBase<E>::assign(const E* data, size_type length) {
    if (data == m_pBegin) {
        return *this;
    }
    if (data == nullptr) {
        length = 0;
    }
    if (data > m_pBegin && data <= m_pEnd) {
        // A piece of this very string: move it to the front before the block can move.
        std::memmove(m_pBegin, data, length * sizeof(E));
        m_pEnd = m_pBegin + length;
        ExactFit(length);
    } else {
        ExactFit(length);
        if (length != 0) {
            std::memcpy(m_pBegin, data, length * sizeof(E));
        }
    }
    m_pEnd = m_pBegin + length;
    *m_pEnd = E();
    return *this;
}

template <typename E>
StringBase<E>& StringBase<E>::assign(const E* text) {
    return assign(text, TextLength(text));
}

template <typename E>
StringBase<E>& StringBase<E>::append(const StringBase& other) {
    const size_type added = other.size();
    GrowForAppend(added);
    // Read other's block only now: appending a string to itself may have moved it.
    std::memcpy(m_pEnd, other.m_pBegin, added * sizeof(E));
    m_pEnd += added;
    *m_pEnd = E();
    return *this;
}

template <typename E>
StringBase<E>& StringBase<E>::append(size_type count, E element) {
    GrowForAppend(count);
    // Through a local end: a store through m_pEnd could alias m_pEnd itself, which would
    // keep the compiler from filling more than one element per step.
    m_pEnd = std::fill_n(m_pEnd, count, element);
    *m_pEnd = E();
    return *this;
}

template <typename E>
void StringBase<E>::resize(size_type n, E fill, bool shrink) {
    const size_type current = size();
    if (n < current) {
        erase(n, current, shrink);
    } else if (n > current) {
        append(n - current, fill);
    }
}

template <typename E>
void StringBase<E>::erase(size_type pos, size_type count, bool shrink) {
    const size_type current = size();
    if (pos > current) {
        ThrowOffsetOutOfRange();
    }
    count = Smaller(count, current - pos);
    // The tail moves down with its terminator.
    std::memmove(m_pBegin + pos, m_pBegin + pos + count, (current - pos - count + 1) * sizeof(E));
    m_pEnd -= count;
    if (shrink) {
        ExactFit(size());
        *m_pEnd = E();
    }
}

template <typename E>
void StringBase<E>::replace(size_type pos, size_type count, const StringBase& other,
                            size_type otherPos, size_type otherCount) {
    const size_type current = size();
    if (pos > current || otherPos > other.size()) {
        ThrowOffsetOutOfRange();
    }
    if (&other == this) {
        // The tail move below would overwrite the source: replace from a copy.
        const StringBase source(*this);
        replace(pos, count, source, otherPos, otherCount);
        return;
    }
    count = Smaller(count, current - pos);
    otherCount = Smaller(otherCount, other.size() - otherPos);
    if (current - count >= static_cast<size_type>(~otherCount)) {
        ThrowResultTooLarge();
    }
    const size_type resultSize = current - count + otherCount;
    const size_type tail = current - pos - count + 1;  // terminator included
    if (otherCount > count) {
        ExactFit(resultSize);
        std::memmove(m_pBegin + pos + otherCount, m_pBegin + pos + count, tail * sizeof(E));
    } else if (otherCount < count) {
        std::memmove(m_pBegin + pos + otherCount, m_pBegin + pos + count, tail * sizeof(E));
        m_pEnd = m_pBegin + resultSize;
        ExactFit(resultSize);
    }
    std::memcpy(m_pBegin + pos, other.m_pBegin + otherPos, otherCount * sizeof(E));
    m_pEnd = m_pBegin + resultSize;
    *m_pEnd = E();
}

template <typename E>
void StringBase<E>::reserve(size_type n) {
    if (n <= capacity()) {
        return;
    }
    const size_type kept = size();
    Reallocate(n);
    m_pEnd = m_pBegin + kept;
    *m_pEnd = E();
}

template <typename E>
StringBase<E> StringBase<E>::substr(size_type pos, size_type count) const {
    const size_type current = size();
    if (pos > current) {
        ThrowOffsetOutOfRange();
    }
    return StringBase(m_pBegin + pos, Smaller(count, current - pos));
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::copy(E* destination, size_type count,
                                                      size_type pos) const {
    const size_type current = size();
    if (pos > current) {
        ThrowOffsetOutOfRange();
    }
    const size_type copied = Smaller(count, current - pos);
    if (copied != 0) {
        std::memcpy(destination, m_pBegin + pos, copied * sizeof(E));
    }
    return copied;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::find(E element, size_type from) const {
    for (size_type i = from, n = size(); i < n; ++i) {
        if (m_pBegin[i] == element) {
            return i;
        }
    }
    return npos;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::find(const E* text, size_type from) const {
    const size_type current = size();
    const size_type length = TextLength(text);
    if (from >= current || length > current - from) {
        return npos;
    }
    for (size_type i = from; i <= current - length; ++i) {
        if (std::memcmp(m_pBegin + i, text, length * sizeof(E)) == 0) {
            return i;
        }
    }
    return npos;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::find_first_of(const E* set, size_type from) const {
    for (size_type i = from, n = size(); i < n; ++i) {
        if (Contains(set, m_pBegin[i])) {
            return i;
        }
    }
    return npos;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::find_first_not_of(const E* set,
                                                                   size_type from) const {
    for (size_type i = from, n = size(); i < n; ++i) {
        if (!Contains(set, m_pBegin[i])) {
            return i;
        }
    }
    return npos;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::rfind(E element, size_type from) const {
    if (empty()) {
        return npos;
    }
    for (size_type i = Smaller(from, size() - 1) + 1; i-- > 0;) {
        if (m_pBegin[i] == element) {
            return i;
        }
    }
    return npos;
}

template <typename E>
typename StringBase<E>::size_type StringBase<E>::find_last_not_of(const E* set,
                                                                  size_type from) const {
    if (empty()) {
        return npos;
    }
    for (size_type i = Smaller(from, size() - 1) + 1; i-- > 0;) {
        if (!Contains(set, m_pBegin[i])) {
            return i;
        }
    }
    return npos;
}

template <typename E>
StringBase<E> operator+(const StringBase<E>& a, const StringBase<E>& b) {
    StringBase<E> result(SafeInteger::Add(a.size(), b.size()), StringBase<E>::Reserved::kTag);
    result.append(a);
    result.append(b);
    return result;
}

// Conversions ---------------------------------------------------------------------------

namespace {
// Bytes of the UTF-8 form of a wide string; invalid values count one byte for their "?".
uint32_t Utf8Length(const WideString& wide) {
    return WideToUtf8::Measure(wide.data(), wide.data() + wide.size());
}

// Code points of a UTF-8 string; malformed input throws InvalidSequence.
uint32_t CodePointCount(const ByteString& utf8) {
    return Utf8ToWide::Count(utf8.data(), utf8.data() + utf8.size());
}
}  // namespace

template <>
StringBase<char>::StringBase(const WideString& other)
    : StringBase(Utf8Length(other), Reserved::kTag) {
    const wchar_t* input = other.data();
    m_pEnd += WideToUtf8::ConvertAll(input, input + other.size(), m_pBegin, m_pCapacityEnd);
    *m_pEnd = '\0';
}

template <>
StringBase<wchar_t>::StringBase(const ByteString& other)
    : StringBase(CodePointCount(other), Reserved::kTag) {
    const char* input = other.data();
    m_pEnd += Utf8ToWide::ConvertAll(input, input + other.size(), m_pBegin, m_pCapacityEnd);
    *m_pEnd = L'\0';
}

// Room for four bytes per wide element.
template <>
StringBase<char>::StringBase(const wchar_t* data, size_type length, const char* charset)
    : StringBase(data == nullptr ? 0 : SafeInteger::Multiply(length, 4), Reserved::kTag) {
    if (data == nullptr || length == 0) {
        return;
    }
    char* reached = m_pCapacityEnd;
    osdep::IConv::WideToNarrow(data, data + length, m_pBegin, reached, charset);
    m_pEnd = reached;
    *m_pEnd = '\0';
}

// At most one wide element per input byte.
template <>
StringBase<wchar_t>::StringBase(const char* data, size_type length, const char* charset)
    : StringBase(data == nullptr ? 0 : length, Reserved::kTag) {
    if (data == nullptr || length == 0) {
        return;
    }
    wchar_t* reached = m_pCapacityEnd;
    osdep::IConv::NarrowToWide(data, data + length, charset, m_pBegin, reached);
    m_pEnd = reached;
    *m_pEnd = L'\0';
}

template <>
StringBase<char>::StringBase(const WideString& other, const char* charset)
    : StringBase(other.data(), other.size(), charset) {}

template <>
StringBase<wchar_t>::StringBase(const ByteString& other, const char* charset)
    : StringBase(other.data(), other.size(), charset) {}

// Comparisons ---------------------------------------------------------------------------

template <>
int32_t StringBase<char>::Compare(const char* text, CompareMode mode) const {
    switch (mode) {
        case CompareMode::Exact:
            return StringCompare::Text(m_pBegin, text);
        case CompareMode::IgnoreCase:
            return StringCompare::TextIgnoreCase(m_pBegin, text);
        case CompareMode::Utf8:
        case CompareMode::Utf8IgnoreCase:
            break;
    }
    return StringCompare::Utf8Ranges(m_pBegin, size(), text, TextLength(text),
                                     mode == CompareMode::Utf8IgnoreCase);
}

template <>
int32_t StringBase<char>::Compare(const StringBase& other, CompareMode mode) const {
    switch (mode) {
        case CompareMode::Exact:
            return StringCompare::Ranges(m_pBegin, size(), other.m_pBegin, other.size());
        case CompareMode::IgnoreCase:
            return StringCompare::RangesIgnoreCase(m_pBegin, size(), other.m_pBegin, other.size());
        case CompareMode::Utf8:
        case CompareMode::Utf8IgnoreCase:
            break;
    }
    return StringCompare::Utf8Ranges(m_pBegin, size(), other.m_pBegin, other.size(),
                                     mode == CompareMode::Utf8IgnoreCase);
}

namespace {
bool FoldsCase(CompareMode mode) {
    return mode == CompareMode::IgnoreCase || mode == CompareMode::Utf8IgnoreCase;
}
}  // namespace

template <>
int32_t StringBase<wchar_t>::Compare(const wchar_t* text, CompareMode mode) const {
    return FoldsCase(mode) ? StringCompare::TextIgnoreCase(m_pBegin, text)
                           : StringCompare::Text(m_pBegin, text);
}

template <>
int32_t StringBase<wchar_t>::Compare(const StringBase& other, CompareMode mode) const {
    return FoldsCase(mode)
               ? StringCompare::RangesIgnoreCase(m_pBegin, size(), other.m_pBegin, other.size())
               : StringCompare::Ranges(m_pBegin, size(), other.m_pBegin, other.size());
}

template class StringBase<char>;
template class StringBase<wchar_t>;
template ByteString operator+(const ByteString&, const ByteString&);
template WideString operator+(const WideString&, const WideString&);

}  // namespace zil
}  // namespace qv
