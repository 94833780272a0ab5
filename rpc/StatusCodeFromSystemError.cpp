// The table that turns a socket error number (Linux numbering, any category) into the
// status code reported to the caller.
#include "rpc/IPCClient.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

namespace {

constexpr int32_t kOther = -314899;
constexpr uint32_t kRows = 125;

struct Row {
    int value;
    int32_t code;
};

constexpr Row kOwnRows[] = {
    {1, -314723},   {4, -314713},   {9, -314709},   {11, -314731},  {12, -314722},  {13, -314700},
    {14, -314710},  {22, -314714},  {24, -314720},  {32, -356060},  {36, -314716},  {88, -314726},
    {90, -314715},  {92, -314724},  {95, -314728},  {97, -314701},  {98, -314702},  {100, -314717},
    {101, -314719}, {102, -314718}, {103, -314706}, {104, -314708}, {105, -314721}, {106, -314703},
    {107, -314725}, {108, -314729}, {110, -314730}, {111, -314707}, {113, -314711}, {114, -314704},
    {115, -314712}, {125, -314727},
};

// Row i holds the code of value i + 1.
struct Table {
    int32_t codes[kRows];
    constexpr Table() : codes() {
        for (uint32_t i = 0; i < kRows; ++i) {
            codes[i] = kOther;
        }
        for (const Row& row : kOwnRows) {
            codes[row.value - 1] = row.code;
        }
    }
};

constexpr Table kTable;

}  // namespace

int32_t IPCClient::StatusCodeFromSystemError(const boost::system::error_code& error) {
    const int value = error.value();
    if (value < 1 || value > static_cast<int>(kRows)) {
        return kOther;
    }
    return kTable.codes[value - 1];
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
