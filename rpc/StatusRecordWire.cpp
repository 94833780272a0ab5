#include "rpc/StatusRecordWire.h"

#include "qv/zil/Exceptions.h"
#include "rpc/Wire.h"

namespace qv {
namespace portableRegistry {
namespace rpc {

using variable::remoteconfig::StatusEntries;
using variable::remoteconfig::StatusEntry;
using variable::remoteconfig::StatusRecord;
using zil::WideString;

namespace {

uint32_t TextSize(const std::unique_ptr<WideString>& text) {
    return text ? Wire::WideSize(*text) : 4;
}

void WriteText(const std::unique_ptr<WideString>& text, char*& cursor, const char* end) {
    if (text) {
        Wire::WriteWide(*text, cursor, end);
    } else {
        Wire::WriteUInt32(0, cursor, end);
    }
}

// True when the next four bytes are all zero; consumes them only then. Throws when
// fewer than four bytes remain.
bool ConsumeZeroWord(const char*& cursor, const char* end) {
    if (cursor > end || Wire::Remaining(cursor, end) < 4) {
        QV_THROW(zil::exception::DeserializationError());
    }
    if (Wire::PeekUInt32(cursor) != 0) {
        return false;
    }
    cursor += 4;
    return true;
}

// Reads a text part: a zero word gives no text.
std::unique_ptr<WideString> ReadText(const char*& cursor, const char* end) {
    if (ConsumeZeroWord(cursor, end)) {
        return nullptr;
    }
    std::unique_ptr<WideString> text(new WideString);
    Wire::ReadWide(*text, cursor, end);
    return text;
}

uint32_t EntriesSize(const StatusEntries& entries) {
    uint32_t total = 4;
    for (const StatusEntry& entry : entries) {
        total = Wire::SaturatingAdd(total, Wire::SaturatingAdd(4, TextSize(entry.text)));
    }
    return total;
}

}  // namespace

uint32_t StatusRecordWire::Size(const StatusRecord& record) {
    const uint32_t entries = record.entries ? EntriesSize(*record.entries) : 4;
    return Wire::SaturatingAdd(Wire::SaturatingAdd(4, TextSize(record.text)), entries);
}

void StatusRecordWire::Write(const StatusRecord& record, char*& cursor, const char* end) {
    Wire::WriteInt32(record.code, cursor, end);
    WriteText(record.text, cursor, end);
    if (!record.entries) {
        Wire::WriteUInt32(0, cursor, end);
        return;
    }
    const StatusEntries& entries = *record.entries;
    if (entries.size() > 0xFFFFFFFFu / 8 || EntriesSize(entries) > Wire::Remaining(cursor, end) ||
        cursor > end) {
        QV_THROW(zil::exception::BufferOverflow());
    }
    Wire::WriteUInt32(static_cast<uint32_t>(entries.size()), cursor, end);
    for (const StatusEntry& entry : entries) {
        Wire::WriteInt32(entry.code, cursor, end);
        WriteText(entry.text, cursor, end);
    }
}

void StatusRecordWire::Read(StatusRecord& record, const char*& cursor, const char* end) {
    record.code = Wire::ReadInt32(cursor, end);
    record.text = ReadText(cursor, end);
    if (ConsumeZeroWord(cursor, end)) {
        record.entries.reset();
        return;
    }
    const uint32_t available = Wire::Remaining(cursor, end);
    const uint32_t count = Wire::ReadUInt32(cursor, end);
    if (count > available) {
        QV_THROW(zil::exception::DeserializationError());
    }
    std::unique_ptr<StatusEntries> entries(new StatusEntries);
    for (uint32_t i = 0; i < count; ++i) {
        StatusEntry entry;
        entry.code = Wire::ReadInt32(cursor, end);
        entry.text = ReadText(cursor, end);
        entries->push_back(std::move(entry));
    }
    record.entries = std::move(entries);
}

}  // namespace rpc
}  // namespace portableRegistry
}  // namespace qv
