// The argument list of every operation, in order, and where each stops.
#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/CatalogueOperations.h"
#include "plugin/SessionOperations.h"
#include "plugin/StatusCodes.h"
#include "plugin/testing/HandlerRun.h"

namespace qv {
namespace variable {
namespace remoteconfig {
namespace {

using testing::Collected;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using testing::FakeContext;
using testing::RunHandler;
using Vars = std::map<std::string, std::string>;

// Each name maps to a value that tells the names apart: "v:<name>".
Vars Named(const std::vector<std::string>& names) {
    Vars vars;
    for (const std::string& name : names) {
        vars[name] = "v:" + name;
    }
    return vars;
}

std::vector<std::string> Values(const std::vector<std::string>& names) {
    std::vector<std::string> values;
    for (const std::string& name : names) {
        values.push_back("v:" + name);
    }
    return values;
}

// Every variable present gives them all in order; leaving out each one in turn gives the
// ones before it and -356006, and the ones after it are never asked for.
void CheckPlainOperation(OperationHandler handler, const std::vector<std::string>& names) {
    Collected all = RunHandler(handler, Named(names));
    EXPECT_EQ(all.code, 0);
    EXPECT_THAT(all.values, ElementsAreArray(Values(names)));
    EXPECT_THAT(all.asked, ElementsAreArray(names));
    for (size_t absent = 0; absent < names.size(); ++absent) {
        Vars vars = Named(names);
        vars.erase(names[absent]);
        Collected cut = RunHandler(handler, vars);
        const std::vector<std::string> before(names.begin(), names.begin() + absent);
        EXPECT_EQ(cut.code, kVariableAbsent) << names[absent];
        EXPECT_THAT(cut.values, ElementsAreArray(Values(before))) << names[absent];
        EXPECT_EQ(cut.asked.size(), absent + 1) << names[absent];
    }
    Collected stopped = RunHandler(handler, Named(names), nullptr, -5);
    EXPECT_EQ(stopped.code, -5);
    EXPECT_TRUE(stopped.values.empty());
    EXPECT_TRUE(stopped.asked.empty());
}

const std::vector<std::string> kMethod = {"X_QV_LIBRARY_PATH_NAME", "X_QV_FUNC_NAME",
                                          "X_QV_CLASS_NAME", "X_QV_CALLING_CONVENTION"};

TEST(CatalogueOperationsTest, PlainOperationsReadTheirVariablesInOrder) {
    CheckPlainOperation(CheckVersionCompatibility,
                        {"X_QV_CLIENT_SIDE_VERSION", "X_QV_OLDEST_COMPATIBLE_VERSION"});
    CheckPlainOperation(ResolveClassAndUrl, {"X_QV_TAG", "X_QV_CONFIGURED_CLASS"});
    std::vector<std::string> proxied = kMethod;
    proxied.insert(proxied.end(), {"name", "leafClassName", "resolvedTag", "remoteSession"});
    CheckPlainOperation(IoObjectProxied, proxied);
}

TEST(CatalogueOperationsTest, RegisterClassAndUrlReadsParentsThenChildren) {
    Vars vars = Named({"X_QV_TAG", "X_QV_CONFIGURED_CLASS", "X_QV_CLASS_HIERARCHY_CRC"});
    vars["parentCount"] = "2";
    vars["childCount"] = "0";
    vars["parent0"] = "P0";
    vars["parent1"] = "P1";
    vars["parent2"] = "P2";
    vars["child0"] = "C0";
    Collected two = RunHandler(RegisterClassAndUrl, vars);
    EXPECT_EQ(two.code, 0);
    EXPECT_THAT(two.values, ElementsAre("v:X_QV_TAG", "v:X_QV_CONFIGURED_CLASS",
                                        "v:X_QV_CLASS_HIERARCHY_CRC", "2", "0", "P0", "P1"));

    vars["parentCount"] = "3";
    vars.erase("parent2");
    vars["childCount"] = "1";
    Collected missing = RunHandler(RegisterClassAndUrl, vars);
    EXPECT_EQ(missing.code, kVariableAbsent);
    EXPECT_EQ(missing.values.back(), "P1");
    EXPECT_EQ(missing.asked.back(), "parent2");  // no child was asked for

    vars["parentCount"] = " 1x";
    vars["childCount"] = "abc";  // not a number: counts 0, text still sent
    Collected odd = RunHandler(RegisterClassAndUrl, vars);
    EXPECT_EQ(odd.code, 0);
    EXPECT_THAT(std::vector<std::string>(odd.values.begin() + 3, odd.values.end()),
                ElementsAre(" 1x", "abc", "P0"));

    vars["parentCount"] = "-1";  // huge count: reads until the first absent parent
    Collected huge = RunHandler(RegisterClassAndUrl, vars);
    EXPECT_EQ(huge.code, kVariableAbsent);
    EXPECT_EQ(huge.values.back(), "P1");

    vars.erase("childCount");  // an absent count: no numbered variable at all
    vars["parentCount"] = "1";
    Collected noCount = RunHandler(RegisterClassAndUrl, vars);
    EXPECT_EQ(noCount.code, kVariableAbsent);
    EXPECT_EQ(noCount.values.size(), 4u);
    EXPECT_EQ(noCount.asked.back(), "childCount");
}

TEST(SessionOperationsTest, SessionValueHeadsTheListAsSignedDecimal) {
    const std::vector<std::string> names = kMethod;
    for (int64_t session : {int64_t{-5}, int64_t{0}, INT64_MIN, INT64_MAX}) {
        FakeContext context("", session);
        Collected closed = RunHandler(CloseSession, Named(names), &context);
        EXPECT_EQ(closed.code, 0);
        ASSERT_EQ(closed.values.size(), 5u);
        EXPECT_EQ(closed.values[0], std::to_string(session));
        EXPECT_EQ(context.sessionCalls, 1);
        EXPECT_STREQ(context.lastName.c_str(), "session");
    }
    FakeContext context("", 9);
    Collected absent = RunHandler(CloseSession, Named({"X_QV_LIBRARY_PATH_NAME"}), &context);
    EXPECT_EQ(absent.code, kVariableAbsent);
    EXPECT_THAT(absent.values, ElementsAre("9", "v:X_QV_LIBRARY_PATH_NAME"));
}

TEST(SessionOperationsTest, UnobtainableSessionReadsNothingOtherExceptionsPassOn) {
    std::vector<std::string> names = kMethod;
    names.insert(names.end(), {"ignoreErrors", "argc", "numberOfBatches", "code",
                               "returnErrClustCode", "tdr", "struct", "numberOfPointers"});
    for (OperationHandler handler : {CloseSession, InvokeMethod, AccessProperty}) {
        FakeContext context;
        context.toThrow = FakeContext::Throw::kUnableToConvert;
        Collected refused = RunHandler(handler, Named(names), &context);
        EXPECT_EQ(refused.code, kSessionUnobtainable);
        EXPECT_TRUE(refused.values.empty());
        EXPECT_TRUE(refused.asked.empty());

        context.toThrow = FakeContext::Throw::kBadAlloc;
        EXPECT_THROW(RunHandler(handler, Named(names), &context), std::bad_alloc);

        Collected stopped = RunHandler(handler, Named(names), &context, -1);
        EXPECT_EQ(stopped.code, -1);
        EXPECT_EQ(context.sessionCalls, 2);  // not asked with a negative code
    }
}

TEST(SessionOperationsTest, InvokeMethodReadsNumberedValues) {
    std::vector<std::string> names = kMethod;
    names.insert(names.end(), {"code", "returnErrClustCode", "tdr", "struct"});
    Vars vars = Named(names);
    vars["numberOfPointers"] = "0";
    vars["value0"] = "a";
    Collected none = RunHandler(InvokeMethod, vars);
    EXPECT_EQ(none.code, 0);
    EXPECT_EQ(none.values.size(), 10u);
    EXPECT_EQ(none.values[9], "0");

    vars["numberOfPointers"] = "2";
    vars["value1"] = "b";
    Collected two = RunHandler(InvokeMethod, vars);
    EXPECT_EQ(two.code, 0);
    ASSERT_EQ(two.values.size(), 12u);
    EXPECT_THAT(std::vector<std::string>(two.values.begin() + 1, two.values.begin() + 9),
                ElementsAreArray(Values(names)));
    EXPECT_EQ(two.values[10], "a");
    EXPECT_EQ(two.values[11], "b");

    vars["numberOfPointers"] = "3";
    Collected short_ = RunHandler(InvokeMethod, vars);
    EXPECT_EQ(short_.code, kVariableAbsent);
    EXPECT_EQ(short_.values.size(), 12u);
    EXPECT_EQ(short_.asked.back(), "value2");
}

Vars PropertyArgument(Vars vars, int i, const std::string& path, const std::string& action) {
    const std::string n = std::to_string(i);
    vars["libraryPathName" + n] = path;
    vars["action" + n] = action;
    vars["id" + n] = "id" + n;
    vars["flags" + n] = "fl" + n;
    vars["tdr" + n] = "tdr" + n;
    vars["value" + n] = "val" + n;
    return vars;
}

Vars PropertyBase(const std::string& argc) {
    Vars vars = {{"ignoreErrors", "0"}, {"argc", argc}, {"numberOfBatches", "nb"}};
    for (int b = 0; b < 4; ++b) {
        const std::string n = std::to_string(b);
        vars["funcName" + n] = "fn" + n;
        vars["className" + n] = "cn" + n;
        vars["callingConvention" + n] = "cc" + n;
    }
    return vars;
}

TEST(SessionOperationsTest, AccessPropertyBatchesByCaseInsensitivePathRuns) {
    FakeContext context("", 11);
    Vars vars = PropertyBase("3");
    vars = PropertyArgument(vars, 0, "P", "1");
    vars = PropertyArgument(vars, 1, "p", "0");
    vars = PropertyArgument(vars, 2, "Q", "1");
    Collected ppq = RunHandler(AccessProperty, vars, &context);
    EXPECT_EQ(ppq.code, 0);
    EXPECT_THAT(ppq.values, ElementsAre("11", "0", "3", "nb", "P", "fn0", "cn0", "cc0", "p", "Q",
                                        "fn1", "cn1", "cc1", "1", "id0", "fl0", "tdr0", "val0", "0",
                                        "id1", "fl1", "tdr1", "1", "id2", "fl2", "tdr2", "val2"));
    // The value of an action-0 argument is never even asked for.
    EXPECT_EQ(std::count(ppq.asked.begin(), ppq.asked.end(), "value1"), 0);

    vars = PropertyBase("3");
    vars = PropertyArgument(vars, 0, "A", "+1");
    vars = PropertyArgument(vars, 1, "B", "01");
    vars = PropertyArgument(vars, 2, "A", "1x");
    Collected aba = RunHandler(AccessProperty, vars, &context);
    EXPECT_EQ(aba.code, 0);
    EXPECT_THAT(aba.values, ElementsAre("11", "0", "3", "nb", "A", "fn0", "cn0", "cc0", "B", "fn1",
                                        "cn1", "cc1", "A", "fn2", "cn2", "cc2", "+1", "id0", "fl0",
                                        "tdr0", "val0", "01", "id1", "fl1", "tdr1", "val1", "1x",
                                        "id2", "fl2", "tdr2", "val2"));
}

TEST(SessionOperationsTest, AccessPropertyStopsAtTheFirstAbsentVariable) {
    Vars zero = PropertyBase("0");
    zero = PropertyArgument(zero, 0, "P", "1");
    Collected none = RunHandler(AccessProperty, zero);
    EXPECT_EQ(none.code, 0);
    EXPECT_THAT(none.values, ElementsAre("42", "0", "0", "nb"));

    Vars vars = PropertyBase("2");
    vars = PropertyArgument(vars, 0, "P", "1");
    vars = PropertyArgument(vars, 1, "Q", "1");
    vars.erase("className1");  // batch variable absent: the action pass never starts
    Collected batch = RunHandler(AccessProperty, vars);
    EXPECT_EQ(batch.code, kVariableAbsent);
    EXPECT_EQ(batch.values.back(), "fn1");
    EXPECT_EQ(batch.asked.back(), "className1");

    vars = PropertyBase("2");
    vars = PropertyArgument(vars, 0, "P", "1");
    vars = PropertyArgument(vars, 1, "P", "1");
    vars.erase("value1");  // action 1 without its value
    Collected value = RunHandler(AccessProperty, vars);
    EXPECT_EQ(value.code, kVariableAbsent);
    EXPECT_EQ(value.values.back(), "tdr1");

    vars = PropertyBase("2");
    vars = PropertyArgument(vars, 0, "P", "0");
    vars.erase("numberOfBatches");  // an absent plain variable ends it before any path
    Collected plain = RunHandler(AccessProperty, vars);
    EXPECT_EQ(plain.code, kVariableAbsent);
    EXPECT_THAT(plain.values, ElementsAre("42", "0", "2"));

    vars = PropertyBase("2");
    vars = PropertyArgument(vars, 0, "P", "1");
    vars = PropertyArgument(vars, 1, "P", "0");
    vars.erase("action1");  // an absent action: id1 and later are not asked for
    Collected action = RunHandler(AccessProperty, vars);
    EXPECT_EQ(action.code, kVariableAbsent);
    EXPECT_EQ(action.values.back(), "val0");
    EXPECT_EQ(action.asked.back(), "action1");
}

}  // namespace
}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
