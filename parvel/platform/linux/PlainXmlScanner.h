#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

#include "parvel/platform/linux/TextArena.h"

namespace parvel {

/// Takes the pieces of a plain XML document off its front. Each `take` tells whether there was a
/// plain one; where there was not, what has been taken of it is not given back.
class PlainXmlScanner {
public:
    /// A name with its prefix apart.
    struct Name {
        std::string_view prefix;
        std::string_view local;
    };

    PlainXmlScanner() = default;
    explicit PlainXmlScanner(std::string_view document)
        : m_at(document.data()), m_end(m_at + document.size()) {}

    [[nodiscard]] bool atEnd() const { return m_at == m_end; }
    [[nodiscard]] bool isAt(char expected) const { return !atEnd() && *m_at == expected; }
    /// Where the next piece begins.
    [[nodiscard]] const char* at() const { return m_at; }
    /// What has been taken from there on.
    [[nodiscard]] std::string_view since(const char* begin) const {
        return {begin, static_cast<std::size_t>(m_at - begin)};
    }

    bool take(char expected) {
        const bool isThere = isAt(expected);
        m_at += isThere ? 1 : 0;
        return isThere;
    }
    bool take(std::string_view expected) {
        const std::string_view rest(m_at, static_cast<std::size_t>(m_end - m_at));
        const bool isThere = rest.starts_with(expected);
        m_at += isThere ? expected.size() : 0;
        return isThere;
    }

    /// Everything before the root element.
    bool takeProlog();
    /// White space and comments outside of the root element, perhaps none.
    bool takeMisc();
    /// What follows upon `<!--`.
    bool takeComment();
    bool takeSpace();
    bool takeName(Name& name);
    /// An equals sign and a value in quotes. The value lies in the document or among the values.
    bool takeAssignment(std::string_view& value);
    /// Text up to `<`, `&` or a carriage return, perhaps none.
    bool takeText(std::string_view& text);
    /// A reference to a character or to a predefined entity; what it means is appended.
    bool takeReference(std::string& decoded);

    /// What holds the values that don't stand in the document as they read.
    [[nodiscard]] TextArena takeValues() { return std::move(m_values); }

private:
    bool takeDeclaration();
    bool takeDoctype();
    bool takeDecodedValue(const char* begin, char quote, std::string_view& value);
    bool takeUnusualCharacter();

    const char* m_at = nullptr;
    const char* m_end = nullptr;
    std::string m_decoded;
    TextArena m_values;
};

}  // namespace parvel
