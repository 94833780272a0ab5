#include "qv/zil/osdep/OSException.h"

namespace qv {
namespace zil {
namespace osdep {

OSException::OSException() : message("Unknown error"), errorNumber(0) {}

OSException::OSException(const ByteString& text, int32_t number)
    : message(text), errorNumber(number) {}

const char* OSException::what() const noexcept { return message.c_str(); }

int32_t OSException::GetCode() const { return 42; }

int32_t OSException::GetNativeError() const { return errorNumber; }

}  // namespace osdep
}  // namespace zil
}  // namespace qv
