#include "qv/zil/Exception.h"

namespace qv {
namespace zil {
namespace exception {

const char* Exception::what() const noexcept { return "unspecified exception"; }

int32_t Exception::GetCode() const { return -1; }

}  // namespace exception
}  // namespace zil
}  // namespace qv
