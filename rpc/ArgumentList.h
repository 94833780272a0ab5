// The ordered argument list of one operation request: the values of its request
// variables in the order read, appended only at the end. Owned by one request.
#pragma once

#include <vector>

#include "qv/zil/StringBase.h"

namespace qv {
namespace variable {
namespace remoteconfig {

using ArgumentList = std::vector<zil::ByteString>;

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
