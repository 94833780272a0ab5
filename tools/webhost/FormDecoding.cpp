#include "tools/webhost/FormDecoding.h"

namespace qv {
namespace devtools {

namespace {

int HexValue(char c) {
    if (c >= '0' && c <= '9') {
        return c - '0';
    }
    if (c >= 'a' && c <= 'f') {
        return c - 'a' + 10;
    }
    if (c >= 'A' && c <= 'F') {
        return c - 'A' + 10;
    }
    return -1;
}

}  // namespace

bool PercentDecode(const std::string& text, bool plusIsSpace, std::string& decoded) {
    decoded.clear();
    decoded.reserve(text.size());
    for (std::string::size_type i = 0; i < text.size(); ++i) {
        const char c = text[i];
        if (c == '%') {
            if (i + 2 >= text.size()) {
                return false;
            }
            const int high = HexValue(text[i + 1]);
            const int low = HexValue(text[i + 2]);
            if (high < 0 || low < 0) {
                return false;
            }
            decoded.push_back(static_cast<char>(high * 16 + low));
            i += 2;
        } else if (c == '+' && plusIsSpace) {
            decoded.push_back(' ');
        } else {
            decoded.push_back(c);
        }
    }
    return true;
}

bool AddFormPairs(const std::string& text, wsruntime::RequestVariables& variables) {
    std::string::size_type start = 0;
    while (start <= text.size()) {
        std::string::size_type end = text.find('&', start);
        if (end == std::string::npos) {
            end = text.size();
        }
        const std::string pair = text.substr(start, end - start);
        if (!pair.empty()) {
            const std::string::size_type equals = pair.find('=');
            std::string name;
            std::string value;
            if (!PercentDecode(pair.substr(0, equals), true, name) ||
                !PercentDecode(equals == std::string::npos ? "" : pair.substr(equals + 1), true,
                               value)) {
                return false;
            }
            variables.AddExact(std::move(name), std::move(value));
        }
        start = end + 1;
    }
    return true;
}

bool SplitTarget(const std::string& target, std::string& operation, std::string& query) {
    if (target.empty() || target[0] != '/') {
        return false;
    }
    const std::string::size_type mark = target.find('?');
    const std::string path = target.substr(0, mark);
    query = mark == std::string::npos ? "" : target.substr(mark + 1);
    const std::string::size_type slash = path.rfind('/');
    return PercentDecode(path.substr(slash + 1), false, operation);
}

}  // namespace devtools
}  // namespace qv
