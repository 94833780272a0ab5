#include "qv/zil/osdep/Thread.h"

#include <cxxabi.h>
#include <pthread.h>
#include <sched.h>
#include <signal.h>
#include <sys/prctl.h>

#include <atomic>
#include <cerrno>
#include <mutex>

#include "qv/zil/Exceptions.h"
#include "qv/zil/osdep/Mutex.h"
#include "qv/zil/osdep/PosixError.h"
#include "qv/zil/osdep/RealTimeKernel.h"

namespace qv {
namespace zil {
namespace osdep {

namespace {

constexpr uint32_t Pack(int policy, int priority) {
    return (static_cast<uint32_t>(policy) << 16) | static_cast<uint32_t>(priority);
}

constexpr uint32_t kDefaultPriorityTable[Thread::kPriorityLevels] = {
    Pack(SCHED_OTHER, 0), Pack(SCHED_OTHER, 0), Pack(SCHED_OTHER, 0),
    Pack(SCHED_OTHER, 0), Pack(SCHED_OTHER, 0), Pack(SCHED_RR, 10),
    Pack(SCHED_RR, 20),   Pack(SCHED_FIFO, 95), Pack(SCHED_FIFO, 99),
};

int32_t DefaultPolicy() {
    pthread_attr_t attributes;
    int policy = SCHED_OTHER;
    if (pthread_attr_init(&attributes) == 0) {
        pthread_attr_getschedpolicy(&attributes, &policy);
        pthread_attr_destroy(&attributes);
    }
    return policy;
}

// Names the calling thread: at most 15 bytes ("first6...last6"), blanks as "_".
void SetCurrentThreadName(const ByteString& requested) {
    ByteString name = requested;
    if (name.size() > 15) {
        name = name.substr(0, 6) + ByteString("...") + name.substr(name.size() - 6, 6);
    }
    for (ByteString::size_type i = 0; i < name.size(); ++i) {
        if (name.data()[i] == ' ') {
            name.data()[i] = '_';
        }
    }
    prctl(PR_SET_NAME, name.c_str(), 0, 0, 0);
}

// Owns a pthread_attr_t for a scope.
class Attributes {
public:
    Attributes() { pthread_attr_init(&m_attributes); }
    ~Attributes() { pthread_attr_destroy(&m_attributes); }
    Attributes(const Attributes&) = delete;
    Attributes& operator=(const Attributes&) = delete;
    pthread_attr_t* get() { return &m_attributes; }

private:
    pthread_attr_t m_attributes;
};

}  // namespace

struct Thread::Impl {
    std::atomic<pthread_t> handle{0};
    std::atomic<bool> joined{false};
    Mutex joinLock;
    Mutex runLock;
    std::mutex priorityLock;  // guards policy and priorityTable
    int32_t policy = DefaultPolicy();
    std::atomic<bool> started{false};
    uint32_t priorityTable[kPriorityLevels];

    void RestorePriorityTable() {
        for (uint32_t level = 0; level < kPriorityLevels; ++level) {
            priorityTable[level] = kDefaultPriorityTable[level];
        }
    }
};

struct Thread::StartBlock {
    Thread* thread;
    std::unique_ptr<ByteString> name;  // null: leave the thread unnamed
};

Thread::Thread() : m_pImpl(new Impl) { m_pImpl->RestorePriorityTable(); }

Thread::~Thread() = default;

void Thread::Start(uint32_t stackSize) { Launch(nullptr, stackSize); }

void Thread::Start(const ByteString& name, uint32_t stackSize) {
    Launch(std::unique_ptr<ByteString>(new ByteString(name)), stackSize);
}

void Thread::Launch(std::unique_ptr<ByteString> name, uint32_t stackSize) {
    m_pImpl->started = true;
    Mutex::ScopedLock starting(m_pImpl->runLock);
    m_pImpl->joined = false;

    Attributes attributes;
    if (stackSize != 0) {
        size_t guardSize = 0;
        if (pthread_attr_getguardsize(attributes.get(), &guardSize) != 0 ||
            static_cast<uint64_t>(stackSize) + guardSize > 0xFFFFFFFFu) {
            guardSize = 0;
        }
        const int error = pthread_attr_setstacksize(attributes.get(), stackSize + guardSize);
        if (error != 0) {
            m_pImpl->started = false;
            QV_THROW(PosixError(error));
        }
    } else if (IsRealTimeKernel()) {
        pthread_attr_setstacksize(attributes.get(), kRealTimeStackSize);
    }
    // The new thread starts with every signal blocked, so none reaches it even before
    // its entry blocks them itself.
    sigset_t allSignals;
    sigfillset(&allSignals);
    pthread_attr_setsigmask_np(attributes.get(), &allSignals);

    std::unique_ptr<StartBlock> block(new StartBlock{this, std::move(name)});
    pthread_t handle;
    const int error = pthread_create(&handle, attributes.get(), &Thread::Entry, block.get());
    if (error != 0) {
        m_pImpl->started = false;
        QV_THROW(PosixError(error));
    }
    block.release();  // the new thread frees it
    m_pImpl->handle = handle;
}

void* Thread::Entry(void* startBlock) {
    Thread* self;
    {
        std::unique_ptr<StartBlock> block(static_cast<StartBlock*>(startBlock));
        self = block->thread;
        if (block->name) {
            SetCurrentThreadName(*block->name);
        }
    }
    // Waits until Start has stored the handle, and keeps two runs from overlapping.
    Mutex::ScopedLock running(self->m_pImpl->runLock);
    sigset_t allSignals;
    sigfillset(&allSignals);
    pthread_sigmask(SIG_SETMASK, &allSignals, nullptr);
    try {
        return self->Run();
    } catch (abi::__forced_unwind&) {
        throw;  // thread cancellation or pthread_exit must unwind to its end
    } catch (...) {
        return nullptr;  // an escaping exception ends this thread only
    }
}

void Thread::Join() {
    if (IsCurrentThread()) {
        // Never self-join, and never wait for joinLock here: another thread may hold it
        // while it waits in pthread_join for this very thread.
        m_pImpl->started = false;
        return;
    }
    Mutex::ScopedLock joining(m_pImpl->joinLock);
    if (!m_pImpl->joined) {
        const pthread_t handle = m_pImpl->handle;
        if (handle != 0) {
            pthread_join(handle, nullptr);
            m_pImpl->handle = 0;  // the descriptor is gone; never hand it to pthreads again
        }
        m_pImpl->joined = true;
    }
    m_pImpl->started = false;
}

bool Thread::IsCurrentThread() const {
    const pthread_t handle = m_pImpl->handle;
    return handle != 0 && pthread_equal(handle, pthread_self()) != 0;
}

uint32_t Thread::GetPriority() {
    std::lock_guard<std::mutex> lock(m_pImpl->priorityLock);
    const pthread_t handle = m_pImpl->handle;
    if (handle == 0) {
        QV_THROW(PosixError(ESRCH));
    }
    int policy = SCHED_OTHER;
    sched_param parameters{};
    const int error = pthread_getschedparam(handle, &policy, &parameters);
    if (error != 0) {
        QV_THROW(PosixError(error));
    }
    m_pImpl->policy = policy;
    if (policy == SCHED_OTHER) {
        return kOrdinaryLevel;
    }
    for (uint32_t level = 0; level + 1 < kPriorityLevels; ++level) {
        if (static_cast<int>(m_pImpl->priorityTable[level] & 0xFFFFu) >=
            parameters.sched_priority) {
            return level;
        }
    }
    return kPriorityLevels - 1;
}

void Thread::SetPriority(uint32_t level) {
    if (level >= kPriorityLevels) {
        QV_THROW(exception::InvalidArgument());
    }
    std::lock_guard<std::mutex> lock(m_pImpl->priorityLock);
    SetScheduling(m_pImpl->priorityTable[level]);
}

void Thread::SetPriority(Scheduling scheduling) {
    std::lock_guard<std::mutex> lock(m_pImpl->priorityLock);
    SetScheduling(scheduling.packed);
}

void Thread::SetScheduling(uint32_t packed) {
    const int32_t policy = static_cast<int32_t>(packed >> 16);
    if (policy != m_pImpl->policy) {
        m_pImpl->policy = policy;
        m_pImpl->RestorePriorityTable();
    }
    const pthread_t handle = m_pImpl->handle;
    if (handle == 0) {
        QV_THROW(PosixError(ESRCH));
    }
    sched_param parameters{};
    parameters.sched_priority = static_cast<int>(packed & 0xFFFFu);
    const int error = pthread_setschedparam(handle, policy, &parameters);
    if (error != 0) {
        QV_THROW(PosixError(error));
    }
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
