#include "basic_thread/gnu/internal/Assertion.h"

#include <cstdio>
#include <cstdlib>

namespace mthread {
namespace internal {

void AssertionFailed(const char* expression, const char* file, int line, const char* function) {
    std::fprintf(stderr, "%s:%d: %s: Assertion `%s' failed.\n", file, line, function, expression);
    std::fflush(stderr);
    std::abort();
}

}  // namespace internal
}  // namespace mthread
