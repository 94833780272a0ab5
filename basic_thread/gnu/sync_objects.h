// The mthread synchronisation primitives in one include: PthreadError, PthreadMutex,
// CriticalSection, ScopedLock, Semaphore and Event.
#pragma once

#include "basic_thread/gnu/CriticalSection.h"
#include "basic_thread/gnu/Event.h"
#include "basic_thread/gnu/PthreadError.h"
#include "basic_thread/gnu/PthreadMutex.h"
#include "basic_thread/gnu/ScopedLock.h"
#include "basic_thread/gnu/Semaphore.h"
