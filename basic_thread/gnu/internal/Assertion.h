// Programming-error checks of the mthread primitives. A failed check prints the file
// label, line, function and the checked expression (after macro expansion) to stderr
// and aborts the process. Always active, independent of NDEBUG; thread-safe.
#pragma once

namespace mthread {
namespace internal {

[[noreturn]] void AssertionFailed(const char* expression, const char* file, int line,
                                  const char* function);

}  // namespace internal
}  // namespace mthread

// The extra level expands macros inside the expression before it is turned into text.
#define MTHREAD_ASSERT(expression, fileLabel) MTHREAD_ASSERT_EXPANDED(expression, fileLabel)
#define MTHREAD_ASSERT_EXPANDED(expression, fileLabel) \
    ((expression)                                      \
         ? static_cast<void>(0)                        \
         : ::mthread::internal::AssertionFailed(#expression, fileLabel, __LINE__, __func__))
