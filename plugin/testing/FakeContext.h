// A request context for the plug-in's unit tests: a fixed operation name and a session
// value, or an exception thrown from GetInt64Value. Used by one thread.
#pragma once

#include <cstdint>
#include <new>
#include <string>

#include "platform/ws_runtime/IRequestContext.h"
#include "qv/zil/Exceptions.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace testing {

class FakeContext : public wsruntime::IRequestContext {
public:
    enum class Throw { kNothing, kUnableToConvert, kBadAlloc, kOther };

    explicit FakeContext(const std::string& operation = "", int64_t session = 0)
        : m_operation(zil::ByteString(operation.c_str())), m_session(session) {}

    int32_t GetInt64Value(const zil::WideString& name, int64_t& value) override {
        ++sessionCalls;
        lastName = zil::ByteString(name);
        switch (toThrow) {
            case Throw::kUnableToConvert:
                throw zil::exception::UnableToConvert();
            case Throw::kBadAlloc:
                throw std::bad_alloc();
            case Throw::kOther:
                throw 7;  // not a std::exception
            case Throw::kNothing:
                break;
        }
        value = m_session;
        return 0;
    }
    int32_t ReservedSlot1() override { return 0; }
    int32_t ReservedSlot2() override { return 0; }
    const zil::WideString* GetOperationName() override { return &m_operation; }

    Throw toThrow = Throw::kNothing;
    int sessionCalls = 0;
    zil::ByteString lastName;

private:
    zil::WideString m_operation;
    int64_t m_session;
};

}  // namespace testing
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
