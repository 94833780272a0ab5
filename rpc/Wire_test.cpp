#include "rpc/Wire.h"

#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "rpc/ParameterArray.h"
#include "rpc/StatusRecordWire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {
namespace {

using variable::remoteconfig::ArgumentList;
using variable::remoteconfig::StatusEntries;
using variable::remoteconfig::StatusEntry;
using variable::remoteconfig::StatusRecord;
using zil::ByteString;
using zil::WideString;
using zil::exception::BufferOverflow;
using zil::exception::DeserializationError;
using zil::exception::InvalidSequence;

using Bytes = std::vector<unsigned char>;

Bytes WriteNarrowBytes(const ByteString& text) {
    std::vector<char> buffer(Wire::NarrowSize(text));
    char* cursor = buffer.data();
    Wire::WriteNarrow(text, cursor, buffer.data() + buffer.size());
    EXPECT_EQ(cursor, buffer.data() + buffer.size());
    return Bytes(buffer.begin(), buffer.end());
}

Bytes WriteStatusBytes(const StatusRecord& record) {
    std::vector<char> buffer(StatusRecordWire::Size(record));
    char* cursor = buffer.data();
    StatusRecordWire::Write(record, cursor, buffer.data() + buffer.size());
    EXPECT_EQ(cursor, buffer.data() + buffer.size());
    return Bytes(buffer.begin(), buffer.end());
}

std::vector<char> Chars(const Bytes& bytes) {
    return std::vector<char>(bytes.begin(), bytes.end());
}

TEST(Wire, NarrowStringBytesAndRejects) {
    EXPECT_EQ(WriteNarrowBytes("abc"), (Bytes{4, 0, 0, 0, 'a', 'b', 'c', 0}));
    EXPECT_EQ(WriteNarrowBytes(""), (Bytes{1, 0, 0, 0, 0}));
    EXPECT_EQ(Wire::NarrowSize(""), 5u);

    // Embedded NULs survive the round trip.
    const ByteString withNul("a\0b", 3);
    std::vector<char> item = Chars(WriteNarrowBytes(withNul));
    const char* cursor = item.data();
    ByteString read("old");
    Wire::ReadNarrow(read, cursor, item.data() + item.size());
    EXPECT_EQ(read.size(), 3u);
    EXPECT_EQ(std::memcmp(read.data(), "a\0b", 3), 0);
    EXPECT_EQ(cursor, item.data() + item.size());

    // Length 0, a missing terminator, and a length beyond the input are refused and leave
    // the target alone.
    std::vector<char> zero = Chars(Bytes{0, 0, 0, 0, 0});
    cursor = zero.data();
    EXPECT_THROW(Wire::ReadNarrow(read, cursor, zero.data() + zero.size()), DeserializationError);
    std::vector<char> noNul = Chars(Bytes{2, 0, 0, 0, 'x', 'y'});
    cursor = noNul.data();
    try {
        Wire::ReadNarrow(read, cursor, noNul.data() + noNul.size());
        ADD_FAILURE() << "no throw";
    } catch (const DeserializationError& e) {
        EXPECT_STREQ(e.file, "qv/zil/StringBase");
    }
    std::vector<char> tooLong = Chars(Bytes{9, 0, 0, 0, 'x', 0});
    cursor = tooLong.data();
    EXPECT_THROW(Wire::ReadNarrow(read, cursor, tooLong.data() + tooLong.size()),
                 DeserializationError);
    cursor = tooLong.data();
    EXPECT_THROW(Wire::ReadNarrow(read, cursor, tooLong.data() + 3), DeserializationError);
    EXPECT_EQ(read.size(), 3u);

    // One byte short of room: nothing fits, BufferOverflow; a cursor past the end too.
    char small[8];
    char* out = small;
    EXPECT_THROW(Wire::WriteNarrow("abc", out, small + 7), BufferOverflow);
    EXPECT_EQ(out, small);  // nothing written, the cursor stays
    EXPECT_THROW(Wire::WriteNarrow("", out, small + 4), BufferOverflow);
    Wire::WriteNarrow("abc", out, small + 8);  // an exact fit
    EXPECT_EQ(out, small + 8);
    EXPECT_EQ(std::memcmp(small, "\4\0\0\0abc\0", 8), 0);
    EXPECT_THROW(Wire::WriteNarrow("", out, small + 7), BufferOverflow);  // cursor past the end
    out = small + 6;
    EXPECT_THROW(Wire::WriteField("x", 0, out, small + 5), BufferOverflow);
}

TEST(Wire, WideStringBytesAndRejects) {
    const WideString text(L"a\u00e9\u20ac");  // 1 + 2 + 3 UTF-8 bytes
    EXPECT_EQ(Wire::WideSize(text), 10u);
    std::vector<char> buffer(10);
    char* cursor = buffer.data();
    Wire::WriteWide(text, cursor, buffer.data() + buffer.size());
    EXPECT_EQ(Bytes(buffer.begin(), buffer.end()),
              (Bytes{6, 0, 0, 0, 'a', 0xC3, 0xA9, 0xE2, 0x82, 0xAC}));
    const char* in = buffer.data();
    WideString read;
    Wire::ReadWide(read, in, buffer.data() + buffer.size());
    EXPECT_TRUE(read == text);

    char four[4];
    cursor = four;
    Wire::WriteWide(WideString(), cursor, four + 4);
    EXPECT_EQ(Bytes(four, four + 4), (Bytes{0, 0, 0, 0}));
    cursor = four;
    EXPECT_THROW(Wire::WriteWide(text, cursor, four + 4), BufferOverflow);

    std::vector<char> bad = Chars(Bytes{2, 0, 0, 0, 0xC3, 0x41});
    in = bad.data();
    EXPECT_THROW(Wire::ReadWide(read, in, bad.data() + bad.size()), InvalidSequence);
    std::vector<char> shortText = Chars(Bytes{5, 0, 0, 0, 'a'});
    in = shortText.data();
    EXPECT_THROW(Wire::ReadWide(read, in, shortText.data() + shortText.size()),
                 DeserializationError);
    EXPECT_TRUE(read == text);
}

TEST(Wire, StringListBytesAndCounts) {
    std::vector<char> buffer(Wire::StringListSize(ArgumentList{}));
    char* cursor = buffer.data();
    Wire::WriteStringList(ArgumentList{}, cursor, buffer.data() + buffer.size());
    EXPECT_EQ(Bytes(buffer.begin(), buffer.end()), (Bytes{0, 0, 0, 0}));

    const ArgumentList list{"ab", ""};
    buffer.assign(Wire::StringListSize(list), 0);
    cursor = buffer.data();
    Wire::WriteStringList(list, cursor, buffer.data() + buffer.size());
    EXPECT_EQ(Bytes(buffer.begin(), buffer.end()),
              (Bytes{2, 0, 0, 0, 3, 0, 0, 0, 'a', 'b', 0, 1, 0, 0, 0, 0}));
    ArgumentList read{"keep"};
    const char* in = buffer.data();
    Wire::ReadStringList(read, in, buffer.data() + buffer.size());
    EXPECT_EQ(read, list);

    // A count larger than the bytes left is refused before anything is allocated.
    std::vector<char> huge = Chars(Bytes{0xFF, 0xFF, 0xFF, 0x7F, 1, 0, 0, 0, 0});
    in = huge.data();
    EXPECT_THROW(Wire::ReadStringList(read, in, huge.data() + huge.size()), DeserializationError);
    EXPECT_EQ(read, list);
}

TEST(StatusRecordWire, BytesOfEmptyPartsAndRoundTrip) {
    StatusRecord minusOne;
    minusOne.code = -1;
    EXPECT_EQ(StatusRecordWire::Size(minusOne), 12u);
    EXPECT_EQ(WriteStatusBytes(minusOne), (Bytes{0xFF, 0xFF, 0xFF, 0xFF, 0, 0, 0, 0, 0, 0, 0, 0}));

    // A present but empty text and an empty entries list look like absent ones and are
    // read back as absent.
    StatusRecord empties;
    empties.code = 5;
    empties.text.reset(new WideString);
    empties.entries.reset(new StatusEntries);
    std::vector<char> bytes = Chars(WriteStatusBytes(empties));
    EXPECT_EQ(Bytes(bytes.begin(), bytes.end()), (Bytes{5, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    StatusRecord read;
    read.text.reset(new WideString(L"stale"));
    read.entries.reset(new StatusEntries(1));
    const char* in = bytes.data();
    StatusRecordWire::Read(read, in, bytes.data() + bytes.size());
    EXPECT_EQ(read.code, 5);
    EXPECT_FALSE(read.text);
    EXPECT_FALSE(read.entries);

    StatusRecord full;
    full.code = -356024;
    full.text.reset(new WideString(L"\u00e9"));
    full.entries.reset(new StatusEntries);
    full.entries->push_back(StatusEntry{7, nullptr});
    full.entries->push_back(StatusEntry{-2, std::unique_ptr<WideString>(new WideString(L"x"))});
    EXPECT_EQ(WriteStatusBytes(full),
              (Bytes{0x48, 0x91, 0xFA, 0xFF, 2, 0, 0,    0,    0xC3, 0xA9, 2, 0, 0, 0, 7,  0,
                     0,    0,    0,    0,    0, 0, 0xFE, 0xFF, 0xFF, 0xFF, 1, 0, 0, 0, 'x'}));
    bytes = Chars(WriteStatusBytes(full));
    in = bytes.data();
    StatusRecordWire::Read(read, in, bytes.data() + bytes.size());
    EXPECT_EQ(in, bytes.data() + bytes.size());
    EXPECT_EQ(read.code, -356024);
    ASSERT_TRUE(read.text && read.entries);
    EXPECT_TRUE(*read.text == WideString(L"\u00e9"));
    ASSERT_EQ(read.entries->size(), 2u);
    EXPECT_EQ((*read.entries)[0].code, 7);
    EXPECT_FALSE((*read.entries)[0].text);
    ASSERT_TRUE((*read.entries)[1].text);
    EXPECT_TRUE(*(*read.entries)[1].text == WideString(L"x"));

    // The entries part is checked as a whole before any of it is written.
    std::vector<char> tight(StatusRecordWire::Size(full) - 1, 0x55);
    char* out = tight.data();
    EXPECT_THROW(StatusRecordWire::Write(full, out, tight.data() + tight.size()), BufferOverflow);
    EXPECT_EQ(static_cast<unsigned char>(tight[10]), 0x55);
}

TEST(StatusRecordWire, FailurePartWayKeepsWhatWasRead) {
    // Code -3, text "t", then an entry count of 100 with only 8 bytes after it.
    std::vector<char> bytes =
        Chars(Bytes{0xFD, 0xFF, 0xFF, 0xFF, 1, 0, 0, 0, 't', 100, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0});
    StatusRecord record;
    record.code = 9;
    record.entries.reset(new StatusEntries(3));
    const char* in = bytes.data();
    EXPECT_THROW(StatusRecordWire::Read(record, in, bytes.data() + bytes.size()),
                 DeserializationError);
    EXPECT_EQ(record.code, -3);
    ASSERT_TRUE(record.text);
    EXPECT_TRUE(*record.text == WideString(L"t"));
    ASSERT_TRUE(record.entries);
    EXPECT_EQ(record.entries->size(), 3u);

    // Fewer than 4 bytes where a part should start.
    std::vector<char> cut = Chars(Bytes{1, 0, 0, 0, 0, 0});
    in = cut.data();
    EXPECT_THROW(StatusRecordWire::Read(record, in, cut.data() + cut.size()), DeserializationError);
    EXPECT_EQ(record.code, 1);
}

TEST(StatusRecord, SetCodeDropsTextClearDropsAll) {
    StatusRecord record;
    record.text.reset(new WideString(L"t"));
    record.entries.reset(new StatusEntries(1));
    record.SetCode(-314730);
    EXPECT_EQ(record.code, -314730);
    EXPECT_FALSE(record.text);
    EXPECT_TRUE(record.entries);
    StatusRecord copy(record);
    EXPECT_EQ(copy.code, -314730);
    EXPECT_TRUE(copy.entries && copy.entries->size() == 1);
    record.Clear();
    EXPECT_EQ(record.code, 0);
    EXPECT_FALSE(record.text || record.entries);
}

TEST(ParameterArray, BorrowedArrayOutlivesItsHolder) {
    ByteString strings[2] = {"a", "b"};
    ParameterArray* holder = ParameterArray::Borrow(strings, 2);
    holder->AddRef();
    holder->Release();
    EXPECT_EQ(holder->Count(), 2u);
    holder->Detach();
    EXPECT_EQ(holder->Count(), 0u);
    holder->Release();  // destroys only the holder (ASan reports a stray delete)
    EXPECT_TRUE(strings[1] == ByteString("b"));

    ParameterArray* owned = ParameterArray::Create(3);
    owned->Strings()[2] = "x";
    owned->AddRef();
    owned->Release();
    EXPECT_EQ(owned->Count(), 3u);
    owned->Release();
}

}  // namespace
}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
