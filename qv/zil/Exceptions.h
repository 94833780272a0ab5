// The foundation library's exception classes: one class per kind of failure, each
// with a fixed what() text and a fixed 32-bit code. The "2" classes add a composed
// message (a fixed prefix followed by a detail text) and are caught by their base.
#pragma once

#include "qv/zil/Exception.h"
#include "qv/zil/StringBase.h"

namespace qv {
namespace zil {
namespace exception {

class OutOfRange : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class OutOfRange2 : public OutOfRange {
public:
    explicit OutOfRange2(const ByteString& detail);  // "Out of range: " + detail
    const char* what() const noexcept override;

    ByteString message;
};

class BoundExceeded : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class BoundExceeded2 : public BoundExceeded {
public:
    // "A request was made that would exceed the bounds: " + detail
    explicit BoundExceeded2(const ByteString& detail);
    const char* what() const noexcept override;

    ByteString message;
};

class InvalidSequence : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class InvalidArgument : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class InvalidArgument2 : public InvalidArgument {
public:
    explicit InvalidArgument2(const ByteString& detail);  // "Invalid argument(s): " + detail
    const char* what() const noexcept override;

    ByteString message;
};

class InvalidLocale : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class NotImplemented : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class UnableToConvert : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class BufferOverflow : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

class DeserializationError : public Exception {
public:
    const char* what() const noexcept override;
    int32_t GetCode() const override;
};

}  // namespace exception
}  // namespace zil
}  // namespace qv
