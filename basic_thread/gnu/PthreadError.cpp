#include "basic_thread/gnu/PthreadError.h"

namespace mthread {

PthreadError::PthreadError(const std::string& reason) : m_message("PthreadError: " + reason) {}

const char* PthreadError::what() const noexcept { return m_message.c_str(); }

}  // namespace mthread
