#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/ws_runtime/RequestTable.h"
#include "platform/ws_runtime/RequestVariables.h"
#include "platform/ws_runtime/WsRuntime.h"

namespace qv {
namespace wsruntime {
namespace {

TEST(RequestVariablesTest, SearchOrderAndHeaderMatching) {
    RequestVariables variables;
    variables.AddHeader("X-QV-Accept", "from-header");
    variables.AddExact("form", "f");
    variables.AddExact("x_qv_accept", "exact-lower");
    variables.AddHeader("Session", "7");

    // Exact names are case-sensitive; headers fold case and '-'/'_'.
    EXPECT_EQ(*variables.Find("X_QV_ACCEPT"), "from-header");
    EXPECT_EQ(*variables.Find("x_qv_accept"), "exact-lower");  // exact beats header
    EXPECT_EQ(*variables.Find("session"), "7");
    EXPECT_EQ(variables.Find("Form"), nullptr);
    EXPECT_EQ(variables.Find("X_QV_ACCEPTX"), nullptr);
    EXPECT_TRUE(RequestVariables::HeaderMatches("a-b_c", "A_B-C"));
    EXPECT_FALSE(RequestVariables::HeaderMatches("a.b", "a_b"));
}

TEST(RequestVariablesTest, RepeatedNamesKeepTheFirstAndManyStayFindable) {
    RequestVariables variables;
    variables.AddExact("value", "first");
    for (int i = 0; i < 2000; ++i) {  // far past any growth step of the storage
        variables.AddExact("value" + std::to_string(i), std::to_string(i));
    }
    variables.AddExact("value", "second");
    EXPECT_EQ(*variables.Find("value"), "first");
    for (int i = 0; i < 2000; ++i) {
        const std::string* found = variables.Find("value" + std::to_string(i));
        ASSERT_NE(found, nullptr) << i;
        EXPECT_EQ(*found, std::to_string(i));
    }
    // A name with a NUL inside is its own name, not its prefix.
    variables.AddExact(std::string("a\0b", 3), "nul");
    EXPECT_EQ(variables.Find("a"), nullptr);
    EXPECT_EQ(*variables.Find(std::string("a\0b", 3)), "nul");
}

TEST(RequestTableTest, RuntimeFunctionsFillTheRequestsOwnResponse) {
    RequestVariables variables;
    variables.AddExact("name", "hello");
    variables.AddExact("empty", "");
    const uint32_t handle = RequestTable::Open(variables);
    const uint32_t other = RequestTable::Open(variables);
    EXPECT_NE(handle, 0u);
    EXPECT_NE(handle, other);

    uint32_t size = 0;
    EXPECT_EQ(ReadRequestVariable_C_REST_QV_GXWS_(handle, "name", nullptr, &size), 0);
    EXPECT_EQ(size, 6u);
    char buffer[6] = {'x', 'x', 'x', 'x', 'x', 'x'};
    EXPECT_EQ(ReadRequestVariable_C_REST_QV_GXWS_(handle, "name", buffer, &size), 0);
    EXPECT_STREQ(buffer, "hello");

    // A short buffer gets what fits and a NUL; the size says what is needed.
    char shortBuffer[3];
    size = 3;
    ReadRequestVariable_C_REST_QV_GXWS_(handle, "name", shortBuffer, &size);
    EXPECT_STREQ(shortBuffer, "he");
    EXPECT_EQ(size, 6u);

    size = 0;
    ReadRequestVariable_C_REST_QV_GXWS_(handle, "empty", nullptr, &size);
    EXPECT_EQ(size, 1u);
    size = 9;
    EXPECT_EQ(ReadRequestVariable_C_REST_QV_GXWS_(handle, "absent", nullptr, &size), -1);
    EXPECT_EQ(size, 0u);

    EXPECT_EQ(SetHTTPResponseCode_QV_GXWS_(handle, 406), 0);
    EXPECT_EQ(SetHTTPResponseCode_QV_GXWS_(handle, 99), -1);
    EXPECT_EQ(WriteOutput_C_REST_QV_GXWS_(handle, "ab\0c", 4), 0);
    EXPECT_EQ(WriteOutput_C_REST_QV_GXWS_(other, "z", 1), 0);

    RequestTable::Response response = RequestTable::Close(handle);
    EXPECT_EQ(response.status, 406);
    EXPECT_EQ(response.body, std::string("ab\0c", 4));
    RequestTable::Response second = RequestTable::Close(other);
    EXPECT_EQ(second.status, 0);
    EXPECT_EQ(second.body, "z");

    // Closed handles are unknown to every function.
    size = 5;
    EXPECT_EQ(ReadRequestVariable_C_REST_QV_GXWS_(handle, "name", nullptr, &size), -1);
    EXPECT_EQ(size, 0u);
    EXPECT_EQ(WriteOutput_C_REST_QV_GXWS_(handle, "a", 1), -1);
    EXPECT_EQ(SetHTTPResponseCode_QV_GXWS_(handle, 500), -1);
    EXPECT_EQ(RequestTable::Close(handle).body, "");
    EXPECT_EQ(RequestTable::OpenCount(), 0u);
}

// Requests opened, read and closed on several threads at once: each read answers from
// its own request, and a closed handle is unknown even to the thread that used it last.
TEST(RequestTableTest, ThreadsServingRequestsAtOnceEachSeeTheirOwn) {
    std::vector<std::thread> threads;
    std::vector<int> wrong(4, 0);
    for (size_t t = 0; t < wrong.size(); ++t) {
        threads.emplace_back([t, &wrong] {
            for (int i = 0; i < 500; ++i) {
                const std::string expected = std::to_string(t) + ":" + std::to_string(i);
                RequestVariables variables;
                variables.AddExact("id", expected);
                const uint32_t handle = RequestTable::Open(variables);
                uint32_t size = 0;
                ReadRequestVariable_C_REST_QV_GXWS_(handle, "id", nullptr, &size);
                std::string value(size, '\0');
                ReadRequestVariable_C_REST_QV_GXWS_(handle, "id", &value[0], &size);
                value.pop_back();
                WriteOutput_C_REST_QV_GXWS_(handle, value.data(),
                                            static_cast<uint32_t>(value.size()));
                wrong[t] +=
                    value == expected && RequestTable::Close(handle).body == expected ? 0 : 1;
                size = 7;
                ReadRequestVariable_C_REST_QV_GXWS_(handle, "id", nullptr, &size);
                wrong[t] += size == 0 ? 0 : 1;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(std::vector<int>(wrong.size(), 0), wrong);
}

// The runtime remembers the last variable a request found; a plug-in that reuses one name
// buffer for the next name must still get that name's value.
TEST(RequestTableTest, EachReadAnswersTheNameAskedForEvenInAReusedBuffer) {
    RequestVariables variables;
    variables.AddExact("value1", "one");
    variables.AddExact("value2", "second");
    variables.AddExact("X-QV-Accept", "exact");
    variables.AddHeader("X-QV-Accept", "header");
    const uint32_t handle = RequestTable::Open(variables);
    const auto read = [handle](const char* asked) {
        uint32_t size = 0;
        ReadRequestVariable_C_REST_QV_GXWS_(handle, asked, nullptr, &size);
        std::string value(size, 'x');
        if (size != 0) {
            ReadRequestVariable_C_REST_QV_GXWS_(handle, asked, &value[0], &size);
            value.pop_back();
        }
        return value;
    };
    char name[16] = "value1";
    EXPECT_EQ("one", read(name));
    name[5] = '2';
    EXPECT_EQ("second", read(name));
    name[5] = '3';
    EXPECT_EQ("", read(name)) << "absent, not the last one found";
    EXPECT_EQ("header", read("X_QV_ACCEPT"));
    EXPECT_EQ("exact", read("X-QV-Accept"));
    EXPECT_EQ("header", read("x-qv-accept"));
    name[5] = '1';
    EXPECT_EQ("one", read(name));
    RequestTable::Close(handle);
}

}  // namespace
}  // namespace wsruntime
}  // namespace qv
