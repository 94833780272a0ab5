#include "qv/zil/SafeInteger.h"

#include "qv/zil/Exceptions.h"

namespace qv {
namespace zil {

void SafeInteger::ThrowOutOfRange() { QV_THROW(exception::OutOfRange()); }

}  // namespace zil
}  // namespace qv
