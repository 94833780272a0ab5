// Root of the foundation library's exception hierarchy and the throw convention.
//
// Every failure of the foundation library is thrown by value as a class of this
// hierarchy, with the source file and line of the throwing statement recorded, and
// caught by reference. what() never includes the location.
#pragma once

#include <cstdint>
#include <exception>

namespace qv {
namespace zil {
namespace exception {

class Exception : public std::exception {
public:
    Exception() = default;
    const char* what() const noexcept override;
    virtual int32_t GetCode() const;

    int32_t line = 0;            // 0 when the thrower did not set it
    const char* file = nullptr;  // static text; null when not set
};

// Records the throwing statement's location in `e` and throws it by value.
template <typename E>
[[noreturn]] void ThrowAt(E e, const char* file, int32_t line) {
    e.file = file;
    e.line = line;
    throw e;
}

}  // namespace exception
}  // namespace zil
}  // namespace qv

// Throws the exception expression with the current file and line recorded.
#define QV_THROW(exceptionExpression) \
    ::qv::zil::exception::ThrowAt((exceptionExpression), __FILE__, __LINE__)
