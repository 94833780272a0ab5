// Fuzz target: the decoders of the registry's parameter payloads, the status record
// (StatusRecordWire::Read) and the string list (Wire::ReadStringList), on arbitrary bytes.
// Only the documented failures may leave them: DeserializationError, and InvalidSequence
// for malformed UTF-8 in a status text. What decodes must encode back to exactly the
// bytes it was read from; a string list that fails to decode leaves the target unchanged.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <vector>

#include "qv/zil/Exceptions.h"
#include "rpc/StatusRecordWire.h"
#include "rpc/Wire.h"

namespace {

using qv::portableRegistry::rpc::StatusRecordWire;
using qv::portableRegistry::rpc::Wire;
using qv::variable::remoteconfig::ArgumentList;
using qv::variable::remoteconfig::StatusEntries;
using qv::variable::remoteconfig::StatusEntry;
using qv::variable::remoteconfig::StatusRecord;
using qv::zil::ByteString;
using qv::zil::WideString;
using qv::zil::exception::DeserializationError;
using qv::zil::exception::InvalidSequence;

void Check(bool condition, const char* what) {
    if (!condition) {
        std::fprintf(stderr, "wire_decoders_fuzz: %s\n", what);
        std::abort();
    }
}

// A record whose every part a successful read must replace.
StatusRecord StaleRecord() {
    StatusRecord record;
    record.code = 77;
    record.text.reset(new WideString(ByteString("stale")));
    record.entries.reset(new StatusEntries);
    record.entries->push_back(StatusEntry{5, nullptr});
    return record;
}

void FuzzStatusRecord(const char* begin, const char* end) {
    StatusRecord record = StaleRecord();
    const char* cursor = begin;
    try {
        StatusRecordWire::Read(record, cursor, end);
    } catch (const DeserializationError&) {
        return;
    } catch (const InvalidSequence&) {
        return;
    }
    Check(cursor >= begin && cursor <= end, "status record: the cursor left the input");
    const size_t consumed = static_cast<size_t>(cursor - begin);
    const uint32_t size = StatusRecordWire::Size(record);
    Check(size == consumed, "status record: the size differs from the bytes read");
    std::vector<char> again(size);
    char* out = again.data();
    StatusRecordWire::Write(record, out, again.data() + again.size());
    Check(out == again.data() + again.size(), "status record: Write wrote less than its size");
    Check(std::memcmp(again.data(), begin, size) == 0,
          "status record: encodes to other bytes than it was read from");
}

bool SameList(const ArgumentList& a, const ArgumentList& b) {
    if (a.size() != b.size()) {
        return false;
    }
    for (size_t i = 0; i < a.size(); ++i) {
        if (a[i].size() != b[i].size() || std::memcmp(a[i].data(), b[i].data(), a[i].size()) != 0) {
            return false;
        }
    }
    return true;
}

void FuzzStringList(const char* begin, const char* end) {
    const ArgumentList sentinel{ByteString("untouched"), ByteString()};
    ArgumentList list = sentinel;
    const char* cursor = begin;
    try {
        Wire::ReadStringList(list, cursor, end);
    } catch (const DeserializationError&) {
        Check(SameList(list, sentinel), "string list: a failed read changed the target");
        return;
    }
    Check(cursor >= begin && cursor <= end, "string list: the cursor left the input");
    const size_t consumed = static_cast<size_t>(cursor - begin);
    const uint32_t size = Wire::StringListSize(list);
    Check(size == consumed, "string list: the size differs from the bytes read");
    std::vector<char> again(size);
    char* out = again.data();
    Wire::WriteStringList(list, out, again.data() + again.size());
    Check(out == again.data() + again.size(), "string list: Write wrote less than its size");
    Check(std::memcmp(again.data(), begin, size) == 0,
          "string list: encodes to other bytes than it was read from");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    // A copy of exactly the input, so that ASan sees every read past its end.
    std::vector<char> bytes(data, data + size);
    const char* begin = bytes.data();
    const char* end = begin + bytes.size();
    FuzzStatusRecord(begin, end);
    FuzzStringList(begin, end);
    return 0;
}
