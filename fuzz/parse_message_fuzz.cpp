// Fuzz target: ParseMessage on arbitrary bytes, as the IPC client hands it a received
// message. A message that parses must serialise back to exactly the bytes it was read
// from (every field of the wire form has one encoding); a failure must be reported as
// -314898 or -314899 in the status record, never as an exception.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "rpc/ParseMessage.h"

namespace {

using qv::portableRegistry::rpc::kMalformedAnswer;
using qv::portableRegistry::rpc::kTransportFailure;
using qv::portableRegistry::rpc::Message;
using qv::portableRegistry::rpc::ParseMessage;
using qv::variable::remoteconfig::StatusRecord;

void Check(bool condition, const char* what) {
    if (!condition) {
        std::fprintf(stderr, "parse_message_fuzz: %s\n", what);
        std::abort();
    }
}

// Messages of a buffer are parsed one after another, as long as they parse.
constexpr int kMessagesPerInput = 8;

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    // A copy of exactly the input, so that ASan sees every read past its end.
    std::vector<char> bytes(data, data + size);
    const char* const begin = bytes.data();
    const char* const end = begin + bytes.size();
    const char* cursor = begin;

    for (int i = 0; i < kMessagesPerInput && cursor < end; ++i) {
        const char* const start = cursor;
        StatusRecord status;
        std::unique_ptr<Message> message = ParseMessage(cursor, end, status);
        Check(cursor >= start && cursor <= end, "the cursor left the input");
        if (!message) {
            Check(status.code == 0 || status.code == kMalformedAnswer ||
                      status.code == kTransportFailure,
                  "a failure other than -314898 or -314899");
            Check(status.code != 0 || cursor == start,
                  "an ignored message (version or kind) moved the cursor");
            return 0;
        }
        Check(status.code == 0, "a parsed message with an error status");

        const size_t consumed = static_cast<size_t>(cursor - start);
        const uint32_t size = message->GetSerializedSize();
        Check(size == consumed, "the serialised size differs from the bytes read");
        std::vector<char> again(size);
        char* out = again.data();
        message->Serialize(out, again.data() + again.size());
        Check(out == again.data() + again.size(), "Serialize wrote fewer bytes than its size");
        Check(std::memcmp(again.data(), start, size) == 0,
              "the message serialises to other bytes than it was read from");

        // A record that already carries an error makes ParseMessage do nothing.
        StatusRecord failed;
        failed.SetCode(-1);
        const char* untouched = start;
        Check(ParseMessage(untouched, end, failed) == nullptr && untouched == start &&
                  failed.code == -1,
              "ParseMessage acted on a record that already carried an error");
    }
    return 0;
}
