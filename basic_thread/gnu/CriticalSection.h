// The recursive, priority-inheriting mutex of the mthread family: its owner may lock it
// again and must unlock it as often. Shared between threads by design; construction
// throws PthreadError.
#pragma once

#include "basic_thread/gnu/PthreadMutex.h"

namespace mthread {

class CriticalSection : public PthreadMutex {
public:
    CriticalSection();
};

}  // namespace mthread
