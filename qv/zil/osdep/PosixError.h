// A failed POSIX call, described by the C library's text for its error number.
// GetCode maps the number: 0 gives 0, ENOENT gives 7, anything else 42.
#pragma once

#include "qv/zil/osdep/OSException.h"

namespace qv {
namespace zil {
namespace osdep {

class PosixError : public OSException {
public:
    PosixError();  // the calling thread's current errno
    explicit PosixError(int32_t errorNumber);
    PosixError(const ByteString& message, int32_t errorNumber);

    int32_t GetCode() const override;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
