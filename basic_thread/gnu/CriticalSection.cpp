#include "basic_thread/gnu/CriticalSection.h"

namespace mthread {

CriticalSection::CriticalSection() : PthreadMutex(PTHREAD_MUTEX_RECURSIVE) {}

}  // namespace mthread
