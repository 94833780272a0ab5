#include "rpc/StatusRecord.h"

namespace qv {
namespace variable {
namespace remoteconfig {

namespace {
std::unique_ptr<zil::WideString> CopyText(const std::unique_ptr<zil::WideString>& text) {
    return text ? std::unique_ptr<zil::WideString>(new zil::WideString(*text)) : nullptr;
}
}  // namespace

StatusRecord::StatusRecord(const StatusRecord& other)
    : code(other.code), text(CopyText(other.text)) {
    if (other.entries) {
        entries.reset(new StatusEntries);
        entries->reserve(other.entries->size());
        for (const StatusEntry& entry : *other.entries) {
            entries->push_back(StatusEntry{entry.code, CopyText(entry.text)});
        }
    }
}

StatusRecord& StatusRecord::operator=(const StatusRecord& other) {
    if (this != &other) {
        StatusRecord copy(other);
        *this = std::move(copy);
    }
    return *this;
}

void StatusRecord::SetCode(int32_t newCode) {
    code = newCode;
    text.reset();
}

void StatusRecord::Clear() {
    code = 0;
    Release();
}

void StatusRecord::Release() {
    text.reset();
    entries.reset();
}

}  // namespace remoteconfig
}  // namespace variable
}  // namespace qv
