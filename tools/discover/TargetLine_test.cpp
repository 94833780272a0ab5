#include "tools/discover/TargetLine.h"

#include <gtest/gtest.h>

namespace qv::tools::discover {
namespace {

TEST(TargetLine, TxtValuesAndTheLine) {
    AvahiStringList* txt =
        avahi_string_list_new("supportTolvane=yes", "MAC=02:1A:2B:3C:4D:5E", "flag",
                              "empty=", "spaced=a b", static_cast<const char*>(nullptr));
    EXPECT_EQ("yes", TxtValue(txt, "supportTolvane"));
    EXPECT_EQ("02:1A:2B:3C:4D:5E", TxtValue(txt, "MAC"));
    EXPECT_EQ("", TxtValue(txt, "flag"));
    EXPECT_EQ("", TxtValue(txt, "empty"));
    EXPECT_EQ("a b", TxtValue(txt, "spaced"));
    EXPECT_EQ("-", TxtValue(txt, "absent"));
    EXPECT_EQ("-", TxtValue(nullptr, "MAC"));
    avahi_string_list_free(txt);

    Target target;
    target.name = "lab rig 2 qv_variable_iotolvane";
    target.host = "qvtarget.local";
    target.address = "169.254.7.1";
    target.port = 80;
    target.mac = "02:1A:2B:3C:4D:5E";
    target.supportTolvane = "yes";
    EXPECT_EQ(
        "lab rig 2 qv_variable_iotolvane\tqvtarget.local\t169.254.7.1\t80\t"
        "MAC=02:1A:2B:3C:4D:5E\tsupportTolvane=yes",
        FormatTarget(target));
    target.port = 65535;
    target.mac = "-";
    EXPECT_NE(std::string::npos, FormatTarget(target).find("\t65535\tMAC=-\t"));
}

}  // namespace
}  // namespace qv::tools::discover
