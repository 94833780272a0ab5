#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "rpc/ParseMessage.h"
#include "rpc/RequestMessage.h"
#include "rpc/ResponseMessage.h"
#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {
namespace {

using variable::remoteconfig::StatusRecord;
using zil::ByteString;
using zil::exception::DeserializationError;

using Bytes = std::vector<unsigned char>;

// The frame of a message: its length (these 4 bytes included), then the message.
Bytes Frame(const Message& message) {
    std::vector<char> buffer(message.GetSerializedSize() + 4);
    Wire::PokeUInt32(static_cast<uint32_t>(buffer.size()), buffer.data());
    char* cursor = buffer.data() + 4;
    message.Serialize(cursor, buffer.data() + buffer.size());
    EXPECT_EQ(cursor, buffer.data() + buffer.size());
    return Bytes(buffer.begin(), buffer.end());
}

void SetStrings(Message& message, const std::vector<ByteString>& values) {
    ParameterArray* holder = ParameterArray::Create(static_cast<uint32_t>(values.size()));
    for (size_t i = 0; i < values.size(); ++i) {
        holder->Strings()[i] = values[i];
    }
    if (RequestMessage* request = dynamic_cast<RequestMessage*>(&message)) {
        request->SetParameters(holder, static_cast<uint32_t>(values.size()));
    } else {
        static_cast<ResponseMessage&>(message).SetParameters(holder,
                                                             static_cast<uint32_t>(values.size()));
    }
}

// Parses the message part of a frame.
std::unique_ptr<Message> Parse(const Bytes& frame, StatusRecord& status) {
    const char* begin = reinterpret_cast<const char*>(frame.data()) + 4;
    const char* cursor = begin;
    return ParseMessage(cursor, reinterpret_cast<const char*>(frame.data()) + frame.size(), status);
}

Bytes Response(uint16_t version, uint32_t kind, uint32_t count) {
    ResponseMessage response(version);
    response.SetReturnValue("rv");
    std::vector<ByteString> values;
    for (uint32_t i = 0; i < count; ++i) {
        values.push_back(ByteString("p"));
    }
    SetStrings(response, values);
    Bytes frame = Frame(response);
    frame[6] = static_cast<unsigned char>(kind);  // kind sits after length and version
    return frame;
}

TEST(Message, RequestFramesAreExact) {
    RequestMessage request;
    request.SetProcedureId(0);
    EXPECT_EQ(request.GetSerializedSize(), 19u);
    EXPECT_EQ(Frame(request),
              (Bytes{23, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0, 0}));
    SetStrings(request, {"abc"});
    EXPECT_EQ(request.GetSerializedSize(), 27u);
    EXPECT_EQ(Frame(request), (Bytes{0x1F, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0,   0,   0,   0, 0,
                                     0,    0, 0, 1, 0, 0, 0, 4, 0, 0, 0, 'a', 'b', 'c', 0}));

    ResponseMessage response;
    response.SetReturnValue("r");
    SetStrings(response, {""});
    EXPECT_EQ(response.GetSerializedSize(), 26u);
    EXPECT_EQ(Frame(response), (Bytes{30, 0, 0, 0, 0,   1, 1, 0, 0, 0, 1, 0, 0, 0, 0,
                                      2,  0, 0, 0, 'r', 0, 1, 0, 0, 0, 1, 0, 0, 0, 0}));
}

TEST(Message, DeserializeChecksKindAndCountAndKeepsOldContents) {
    RequestMessage request;
    request.SetProcedureId(3);
    SetStrings(request, {"x", "y"});
    Bytes frame = Frame(request);

    RequestMessage read;
    const char* cursor = reinterpret_cast<const char*>(frame.data()) + 4;
    read.Deserialize(cursor, reinterpret_cast<const char*>(frame.data()) + frame.size());
    EXPECT_EQ(read.GetProcedureId(), 3);
    ASSERT_EQ(read.GetParameterCount(), 2u);
    EXPECT_TRUE(read.GetParameter(1) == ByteString("y"));

    // A response read as a request, and a request read as a response, are refused and the
    // objects keep what they held.
    Bytes response = Response(0x0100, 1, 1);
    cursor = reinterpret_cast<const char*>(response.data()) + 4;
    EXPECT_THROW(
        read.Deserialize(cursor, reinterpret_cast<const char*>(response.data()) + response.size()),
        DeserializationError);
    EXPECT_EQ(read.GetProcedureId(), 3);
    EXPECT_EQ(read.GetParameterCount(), 2u);
    ResponseMessage asResponse;
    asResponse.SetReturnValue("keep");
    cursor = reinterpret_cast<const char*>(frame.data()) + 4;
    EXPECT_THROW(
        asResponse.Deserialize(cursor, reinterpret_cast<const char*>(frame.data()) + frame.size()),
        DeserializationError);
    EXPECT_TRUE(asResponse.GetReturnValue() == ByteString("keep"));

    // A truncated parameter leaves the message as it was.
    cursor = reinterpret_cast<const char*>(frame.data()) + 4;
    EXPECT_THROW(
        read.Deserialize(cursor, reinterpret_cast<const char*>(frame.data()) + frame.size() - 1),
        DeserializationError);
    EXPECT_EQ(read.GetParameterCount(), 2u);
}

TEST(ParseMessage, PicksClassByKindAndLimitsParameters) {
    StatusRecord status;
    std::unique_ptr<Message> message = Parse(Response(0x0100, 1, 5), status);
    ASSERT_TRUE(message);
    EXPECT_EQ(status.code, 0);
    EXPECT_EQ(message->GetKind(), 1u);
    EXPECT_EQ(static_cast<ResponseMessage&>(*message).GetParameterCount(), 5u);
    EXPECT_TRUE(static_cast<ResponseMessage&>(*message).GetReturnValue() == ByteString("rv"));

    RequestMessage request;
    request.SetProcedureId(0);
    message = Parse(Frame(request), status);
    ASSERT_TRUE(message);
    EXPECT_EQ(message->GetKind(), 0u);

    // Version 0 is read like 0x0100.
    message = Parse(Response(0, 1, 0), status);
    ASSERT_TRUE(message);
    EXPECT_EQ(message->GetVersion(), 0u);

    status.text.reset(new zil::WideString(L"kept"));
    message = Parse(Response(0x0100, 1, 6), status);
    EXPECT_FALSE(message);
    EXPECT_EQ(status.code, kMalformedAnswer);
    EXPECT_FALSE(status.text);
}

TEST(ParseMessage, ForeignVersionOrKindAndShortInput) {
    StatusRecord status;
    status.code = 7;
    status.text.reset(new zil::WideString(L"kept"));
    EXPECT_FALSE(Parse(Response(0x0101, 1, 1), status));
    EXPECT_FALSE(Parse(Response(0x0100, 2, 1), status));
    EXPECT_EQ(status.code, 7);
    EXPECT_TRUE(status.text);

    const Bytes five{0, 0, 0, 0, 0, 1, 1, 0, 0};  // frame length, then 5 bytes
    EXPECT_FALSE(Parse(five, status));
    EXPECT_EQ(status.code, kMalformedAnswer);

    // A negative code makes the parser read nothing.
    status.code = -5;
    const Bytes good = Response(0x0100, 1, 1);
    const char* cursor = reinterpret_cast<const char*>(good.data()) + 4;
    const char* before = cursor;
    EXPECT_FALSE(
        ParseMessage(cursor, reinterpret_cast<const char*>(good.data()) + good.size(), status));
    EXPECT_EQ(cursor, before);
    EXPECT_EQ(status.code, -5);
}

}  // namespace
}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
