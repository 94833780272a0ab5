#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {
namespace exception {

namespace {
constexpr int32_t Code(uint32_t pattern) { return static_cast<int32_t>(pattern); }

constexpr int32_t kOutOfRange = Code(0x8ABC7007);  // shared by OutOfRange and BoundExceeded
constexpr int32_t kInvalidSequence = Code(0x8ABC7030);
constexpr int32_t kInvalidArgument = Code(0x8ABC700F);
constexpr int32_t kInvalidLocale = Code(0x8ABC7024);
constexpr int32_t kNotImplemented = Code(0x80004001);
constexpr int32_t kUnableToConvert = Code(0x8ABC7034);
constexpr int32_t kBufferOverflow = Code(0x8ABC7017);
constexpr int32_t kDeserializationError = Code(0x8ABC7014);

ByteString Compose(const char* prefix, const ByteString& detail) {
    return ByteString(prefix) + detail;
}
}  // namespace

const char* OutOfRange::what() const noexcept { return "Out of range"; }
int32_t OutOfRange::GetCode() const { return kOutOfRange; }

OutOfRange2::OutOfRange2(const ByteString& detail) : message(Compose("Out of range: ", detail)) {}
const char* OutOfRange2::what() const noexcept { return message.c_str(); }

const char* BoundExceeded::what() const noexcept {
    return "A request was made that would exceed the bounds";
}
int32_t BoundExceeded::GetCode() const { return kOutOfRange; }

BoundExceeded2::BoundExceeded2(const ByteString& detail)
    : message(Compose("A request was made that would exceed the bounds: ", detail)) {}
const char* BoundExceeded2::what() const noexcept { return message.c_str(); }

const char* InvalidSequence::what() const noexcept { return "Invalid UTF8 encoding sequence"; }
int32_t InvalidSequence::GetCode() const { return kInvalidSequence; }

const char* InvalidArgument::what() const noexcept { return "Invalid argument(s)"; }
int32_t InvalidArgument::GetCode() const { return kInvalidArgument; }

InvalidArgument2::InvalidArgument2(const ByteString& detail)
    : message(Compose("Invalid argument(s): ", detail)) {}
const char* InvalidArgument2::what() const noexcept { return message.c_str(); }

const char* InvalidLocale::what() const noexcept { return "Invalid locale"; }
int32_t InvalidLocale::GetCode() const { return kInvalidLocale; }

const char* NotImplemented::what() const noexcept { return "Not implemented"; }
int32_t NotImplemented::GetCode() const { return kNotImplemented; }

const char* UnableToConvert::what() const noexcept { return "Unable to convert."; }
int32_t UnableToConvert::GetCode() const { return kUnableToConvert; }

const char* BufferOverflow::what() const noexcept { return "Buffer overflowed"; }
int32_t BufferOverflow::GetCode() const { return kBufferOverflow; }

const char* DeserializationError::what() const noexcept { return "Failed to deserialize"; }
int32_t DeserializationError::GetCode() const { return kDeserializationError; }

}  // namespace exception
}  // namespace zil
}  // namespace qv
