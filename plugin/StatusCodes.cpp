#include "plugin/StatusCodes.h"

namespace qv {
namespace variable {
namespace remoteconfig {

int32_t HttpStatusForCode(int32_t code) {
    switch (code) {
        case 0:
            return 0;
        case kVariableAbsent:
            return 400;
        case kAcceptsOnlyHtml:
            return 406;
        case kUnknownOperation:
            return 501;
        default:
            return 500;
    }
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
