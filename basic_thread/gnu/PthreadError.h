// The error the mthread primitives throw when a mutex cannot be built: what() reads
// "PthreadError: " followed by the reason. Not part of the qv::zil exception hierarchy.
#pragma once

#include <exception>
#include <string>

namespace mthread {

class PthreadError : public std::exception {
public:
    explicit PthreadError(const std::string& reason);
    const char* what() const noexcept override;

private:
    std::string m_message;
};

}  // namespace mthread
