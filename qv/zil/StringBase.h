// The foundation library's owned string: a heap block of elements that always keeps a
// NUL after the last element and may hold embedded NULs. ByteString holds 8-bit text
// (UTF-8 or raw bytes), WideString one Unicode code point per 32-bit wchar_t.
//
// Sizes and positions are unsigned 32-bit; every size computation is checked. Failures
// throw the foundation exceptions (an offset past the end, OutOfRange2; a replacement
// result that is too long, BoundExceeded2; memory exhaustion, std::bad_alloc) and leave
// the string unchanged. A string is used by one thread at a time.
#pragma once

#include <cstdint>
#include <type_traits>

namespace qv {
namespace zil {

// How two strings are compared: byte- or element-wise, or by UTF-8 code point
// (the same as element-wise for wide strings), each case-sensitive or not.
enum class CompareMode { Exact, IgnoreCase, Utf8, Utf8IgnoreCase };

template <typename E>
class StringBase {
public:
    using Element = E;
    using OtherElement = std::conditional_t<std::is_same<E, char>::value, wchar_t, char>;
    using size_type = uint32_t;
    static constexpr size_type npos = 0xFFFFFFFF;

    StringBase();
    StringBase(const E* text);  // NOLINT: implicit on purpose; null is empty text
    StringBase(const E* data, size_type length);
    StringBase(const StringBase& other);
    StringBase& operator=(const StringBase& other);
    ~StringBase();

    // Conversions between the two instantiations. Without a character set, narrow text
    // is UTF-8 (malformed input throws InvalidSequence); with one, the conversion goes
    // through iconv ("" names the current locale's set) and unconvertible units become "?".
    explicit StringBase(const StringBase<OtherElement>& other);
    StringBase(const StringBase<OtherElement>& other, const char* charset);
    StringBase(const OtherElement* data, size_type length, const char* charset);

    void swap(StringBase& other) noexcept;

    StringBase& assign(const E* data, size_type length);
    StringBase& assign(const E* text);
    StringBase& append(const StringBase& other);
    StringBase& append(size_type count, E element);
    void resize(size_type n, E fill = E(), bool shrink = false);
    void erase(size_type pos = 0, size_type count = npos, bool shrink = false);
    void replace(size_type pos, size_type count, const StringBase& other, size_type otherPos = 0,
                 size_type otherCount = npos);
    void reserve(size_type n);

    StringBase substr(size_type pos = 0, size_type count = npos) const;
    size_type copy(E* destination, size_type count, size_type pos = 0) const;

    const E* data() const { return m_pBegin; }
    E* data() { return m_pBegin; }
    const E* c_str() const { return m_pBegin; }
    size_type size() const { return static_cast<size_type>(m_pEnd - m_pBegin); }
    size_type capacity() const { return static_cast<size_type>(m_pCapacityEnd - m_pBegin); }
    bool empty() const { return m_pEnd == m_pBegin; }
    const E& operator[](size_type index) const { return m_pBegin[index]; }  // unchecked
    E& operator[](size_type index) { return m_pBegin[index]; }              // unchecked

    // Searches return the index of the first match at or after `from` (last match at or
    // before it for the reverse ones), or npos. `set` and `text` are NUL-terminated.
    size_type find(E element, size_type from = 0) const;
    size_type find(const E* text, size_type from = 0) const;
    size_type find_first_of(const E* set, size_type from = 0) const;
    size_type find_first_not_of(const E* set, size_type from = 0) const;
    size_type rfind(E element, size_type from = npos) const;
    size_type find_last_not_of(const E* set, size_type from = npos) const;

    // Negative, 0 or positive; null text counts as empty text.
    int32_t Compare(const E* text, CompareMode mode = CompareMode::Exact) const;
    int32_t Compare(const StringBase& other, CompareMode mode = CompareMode::Exact) const;

    template <typename Other>
    bool IsEqual(const Other& other, CompareMode mode = CompareMode::Exact) const {
        return Compare(other, mode) == 0;
    }
    template <typename Other>
    bool IsNotEqual(const Other& other, CompareMode mode = CompareMode::Exact) const {
        return Compare(other, mode) != 0;
    }
    template <typename Other>
    bool IsLess(const Other& other, CompareMode mode = CompareMode::Exact) const {
        return Compare(other, mode) < 0;
    }
    template <typename Other>
    bool IsGreater(const Other& other, CompareMode mode = CompareMode::Exact) const {
        return Compare(other, mode) > 0;
    }

private:
    template <typename T>
    friend StringBase<T> operator+(const StringBase<T>& a, const StringBase<T>& b);

    // An empty string whose block holds exactly `capacity` elements and the terminator.
    enum class Reserved { kTag };
    StringBase(size_type capacity, Reserved);

    void ExactFit(size_type n);
    void Reallocate(size_type n);
    void GrowForAppend(size_type added);
    void Release() noexcept;

    E* m_pBegin;
    E* m_pEnd;
    E* m_pCapacityEnd;
};

using ByteString = StringBase<char>;
using WideString = StringBase<wchar_t>;

// The conversions and comparisons differ per element type.
template <>
StringBase<char>::StringBase(const StringBase<wchar_t>& other);
template <>
StringBase<wchar_t>::StringBase(const StringBase<char>& other);
template <>
StringBase<char>::StringBase(const StringBase<wchar_t>& other, const char* charset);
template <>
StringBase<wchar_t>::StringBase(const StringBase<char>& other, const char* charset);
template <>
StringBase<char>::StringBase(const wchar_t* data, size_type length, const char* charset);
template <>
StringBase<wchar_t>::StringBase(const char* data, size_type length, const char* charset);
template <>
int32_t StringBase<char>::Compare(const char* text, CompareMode mode) const;
template <>
int32_t StringBase<wchar_t>::Compare(const wchar_t* text, CompareMode mode) const;
template <>
int32_t StringBase<char>::Compare(const StringBase& other, CompareMode mode) const;
template <>
int32_t StringBase<wchar_t>::Compare(const StringBase& other, CompareMode mode) const;

template <typename E>
StringBase<E> operator+(const StringBase<E>& a, const StringBase<E>& b);

template <typename E>
bool operator==(const StringBase<E>& a, const StringBase<E>& b) {
    return a.Compare(b) == 0;
}
template <typename E>
bool operator!=(const StringBase<E>& a, const StringBase<E>& b) {
    return a.Compare(b) != 0;
}
template <typename E>
bool operator<(const StringBase<E>& a, const StringBase<E>& b) {
    return a.Compare(b) < 0;
}

// Orders keys byte-wise ignoring ASCII case, for maps keyed by names.
struct LessIgnoreCase {
    bool operator()(const ByteString& a, const ByteString& b) const {
        return a.IsLess(b, CompareMode::IgnoreCase);
    }
};

extern template class StringBase<char>;
extern template class StringBase<wchar_t>;
extern template ByteString operator+(const ByteString&, const ByteString&);
extern template WideString operator+(const WideString&, const WideString&);

}  // namespace zil
}  // namespace qv
