#include "qv/zil/osdep/PosixError.h"

#include <cerrno>
#include <cstring>

namespace qv {
namespace zil {
namespace osdep {

namespace {
// strerror's text, through the thread-safe GNU strerror_r.
ByteString ErrorText(int32_t errorNumber) {
    char buffer[256];
    return ByteString(strerror_r(errorNumber, buffer, sizeof buffer));
}
}  // namespace

PosixError::PosixError() : PosixError(errno) {}

PosixError::PosixError(int32_t number) : OSException(ErrorText(number), number) {}

PosixError::PosixError(const ByteString& text, int32_t number) : OSException(text, number) {}

int32_t PosixError::GetCode() const {
    switch (errorNumber) {
        case 0:
            return 0;
        case ENOENT:
            return 7;
        default:
            return OSException::GetCode();
    }
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
