#include "rpc/Wire.h"

#include <cstring>

#include "qv/zil/Exceptions.h"
#include "qv/zil/Utf8ToWide.h"
#include "qv/zil/WideToUtf8.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

using zil::ByteString;
using zil::WideString;
using zil::exception::BufferOverflow;
using zil::exception::DeserializationError;

uint32_t Wire::Remaining(const char* cursor, const char* end) {
    return cursor <= end ? static_cast<uint32_t>(end - cursor) : 0;
}

uint32_t Wire::SaturatingAdd(uint32_t a, uint32_t b) {
    return a > 0xFFFFFFFFu - b ? 0xFFFFFFFFu : a + b;
}

void Wire::WriteField(const void* source, uint32_t count, char*& cursor, const char* end) {
    if (cursor > end || Remaining(cursor, end) < count) {
        QV_THROW(BufferOverflow());
    }
    if (count != 0) {
        std::memcpy(cursor, source, count);
    }
    cursor += count;
}

void Wire::ReadField(void* destination, uint32_t count, const char*& cursor, const char* end) {
    if (cursor > end || Remaining(cursor, end) < count) {
        QV_THROW(DeserializationError());
    }
    if (count != 0) {
        std::memcpy(destination, cursor, count);
    }
    cursor += count;
}

uint32_t Wire::PeekUInt32(const char* data) {
    const unsigned char* bytes = reinterpret_cast<const unsigned char*>(data);
    return static_cast<uint32_t>(bytes[0]) | static_cast<uint32_t>(bytes[1]) << 8 |
           static_cast<uint32_t>(bytes[2]) << 16 | static_cast<uint32_t>(bytes[3]) << 24;
}

void Wire::PokeUInt32(uint32_t value, char* data) {
    for (int i = 0; i < 4; ++i) {
        data[i] = static_cast<char>((value >> (8 * i)) & 0xFF);
    }
}

void Wire::WriteUInt16(uint16_t value, char*& cursor, const char* end) {
    const char bytes[2] = {static_cast<char>(value & 0xFF), static_cast<char>(value >> 8)};
    WriteField(bytes, 2, cursor, end);
}

void Wire::WriteUInt32(uint32_t value, char*& cursor, const char* end) {
    char bytes[4];
    PokeUInt32(value, bytes);
    WriteField(bytes, 4, cursor, end);
}

void Wire::WriteInt32(int32_t value, char*& cursor, const char* end) {
    WriteUInt32(static_cast<uint32_t>(value), cursor, end);
}

uint16_t Wire::ReadUInt16(const char*& cursor, const char* end) {
    unsigned char bytes[2];
    ReadField(bytes, 2, cursor, end);
    return static_cast<uint16_t>(bytes[0] | bytes[1] << 8);
}

uint32_t Wire::ReadUInt32(const char*& cursor, const char* end) {
    char bytes[4];
    ReadField(bytes, 4, cursor, end);
    return PeekUInt32(bytes);
}

int32_t Wire::ReadInt32(const char*& cursor, const char* end) {
    return static_cast<int32_t>(ReadUInt32(cursor, end));
}

uint32_t Wire::NarrowSize(const ByteString& text) {
    return SaturatingAdd(SaturatingAdd(text.size(), 1), 4);
}

void Wire::WriteNarrow(const ByteString& text, char*& cursor, const char* end) {
    // One bounds check and one copy per item: an argument list writes one item per value.
    const uint32_t room = Remaining(cursor, end);
    const uint32_t length = text.size();
    if (cursor > end || room < 5 || length > room - 5) {
        QV_THROW(BufferOverflow());
    }
    PokeUInt32(length + 1, cursor);
    if (length != 0) {
        std::memcpy(cursor + 4, text.data(), length);
    }
    cursor[4 + length] = '\0';
    cursor += length + 5;
}

void Wire::ReadNarrow(ByteString& text, const char*& cursor, const char* end) {
    const uint32_t n = ReadUInt32(cursor, end);
    if (n < 1 || n > Remaining(cursor, end)) {
        QV_THROW(DeserializationError());
    }
    if (cursor[n - 1] != 0) {
        // The item lacks its terminator: reported as the string type's own failure.
        zil::exception::ThrowAt(DeserializationError(), "qv/zil/StringBase", __LINE__);
    }
    text.assign(cursor, n - 1);
    cursor += n;
}

uint32_t Wire::WideSize(const WideString& text) {
    const uint32_t utf8 =
        zil::WideToUtf8::Measure(text.data(), text.data() + text.size(), kWideLengthCap);
    return utf8 + 4;
}

void Wire::WriteWide(const WideString& text, char*& cursor, const char* end) {
    const wchar_t* input = text.data();
    const wchar_t* inputEnd = input + text.size();
    const uint32_t length = zil::WideToUtf8::Measure(input, inputEnd, kWideLengthCap);
    const uint32_t remaining = Remaining(cursor, end);
    if (cursor > end || remaining < 4 || remaining - 4 < length) {
        QV_THROW(BufferOverflow());
    }
    WriteUInt32(length, cursor, end);
    if (length != 0) {
        cursor += zil::WideToUtf8::ConvertAll(input, inputEnd, cursor, cursor + length);
    }
}

void Wire::ReadWide(WideString& text, const char*& cursor, const char* end) {
    const uint32_t length = ReadUInt32(cursor, end);
    if (length == 0) {
        text = WideString();
        return;
    }
    if (length > Remaining(cursor, end)) {
        QV_THROW(DeserializationError());
    }
    const char* input = cursor;
    const uint32_t count = zil::Utf8ToWide::Count(input, input + length);
    WideString decoded;
    decoded.resize(count);
    zil::Utf8ToWide::ConvertAll(input, cursor + length, decoded.data(),
                                decoded.data() + decoded.size());
    text.swap(decoded);
    cursor += length;
}

uint32_t Wire::StringListSize(const variable::remoteconfig::ArgumentList& list) {
    uint32_t total = 4;
    for (const ByteString& item : list) {
        total = SaturatingAdd(total, NarrowSize(item));
    }
    return total;
}

void Wire::WriteStringList(const variable::remoteconfig::ArgumentList& list, char*& cursor,
                           const char* end) {
    WriteUInt32(static_cast<uint32_t>(list.size()), cursor, end);
    for (const ByteString& item : list) {
        WriteNarrow(item, cursor, end);
    }
}

void Wire::ReadStringList(variable::remoteconfig::ArgumentList& list, const char*& cursor,
                          const char* end) {
    const uint32_t count = ReadUInt32(cursor, end);
    // Every item takes at least 5 bytes: a larger count cannot be honest.
    if (count > Remaining(cursor, end) / 5) {
        QV_THROW(DeserializationError());
    }
    variable::remoteconfig::ArgumentList items;
    items.reserve(count);
    for (uint32_t i = 0; i < count; ++i) {
        items.emplace_back();
        ReadNarrow(items.back(), cursor, end);
    }
    list.swap(items);
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
