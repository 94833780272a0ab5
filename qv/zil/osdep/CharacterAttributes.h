// Upper-cases single narrow or wide characters through one locale's std::ctype ("C" by default).
// A locale name the C++ library rejects throws InvalidArgument2 with the library's reason.
#pragma once

#include <locale>

namespace qv {
namespace zil {
namespace osdep {

class CharacterAttributes {
public:
    CharacterAttributes();  // the classic "C" locale, shared by the whole process
    explicit CharacterAttributes(const char* localeName);

    wchar_t ToUpper(wchar_t character) const;
    char ToUpper(char character) const;

private:
    std::locale m_locale;
};

}  // namespace osdep
}  // namespace zil
}  // namespace qv
