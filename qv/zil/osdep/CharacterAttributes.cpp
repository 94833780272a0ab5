#include "qv/zil/osdep/CharacterAttributes.h"

#include <exception>

#include "qv/zil/Exceptions.h"
#include "qv/zil/StringBase.h"

namespace qv {
namespace zil {
namespace osdep {

namespace {

// Created once, on first use; every default-constructed object copies it.
const std::locale& ClassicLocale() {
    static const std::locale classic("C");
    return classic;
}

std::locale MakeLocale(const char* localeName) {
    try {
        return std::locale(localeName);
    } catch (const std::exception& e) {
        QV_THROW(exception::InvalidArgument2(ByteString(e.what())));
    }
}

}  // namespace

CharacterAttributes::CharacterAttributes() : m_locale(ClassicLocale()) {}

CharacterAttributes::CharacterAttributes(const char* localeName)
    : m_locale(MakeLocale(localeName)) {}

wchar_t CharacterAttributes::ToUpper(wchar_t character) const {
    return std::use_facet<std::ctype<wchar_t>>(m_locale).toupper(character);
}

char CharacterAttributes::ToUpper(char character) const {
    return std::use_facet<std::ctype<char>>(m_locale).toupper(character);
}

}  // namespace osdep
}  // namespace zil
}  // namespace qv
