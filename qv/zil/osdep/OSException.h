// A failed operating-system call: a description and the system's error number.
#pragma once

#include <cstdint>

#include "qv/zil/Exception.h"
#include "qv/zil/StringBase.h"

namespace qv {
namespace zil {
namespace osdep {

class OSException : public exception::Exception {
public:
    OSException();  // "Unknown error", error number 0
    OSException(const ByteString& message, int32_t errorNumber);

    const char* what() const noexcept override;
    int32_t GetCode() const override;  // always 42
    virtual int32_t GetNativeError() const;

    ByteString message;
    int32_t errorNumber;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
