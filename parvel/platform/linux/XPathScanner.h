#pragma once

#include <cstddef>
#include <string_view>

namespace parvel {

/// Takes pieces off the front of an XPath expression. Each `take` skips white space first.
class XPathScanner {
public:
    explicit XPathScanner(std::string_view text) : m_rest(text) {}

    [[nodiscard]] std::string_view rest() const { return m_rest; }
    [[nodiscard]] bool atEnd() {
        skipSpace();
        return m_rest.empty();
    }
    bool take(std::string_view piece) {
        skipSpace();
        if (!m_rest.starts_with(piece))
            return false;
        m_rest.remove_prefix(piece.size());
        return true;
    }
    /// Any characters of names, the colon of a qualified one too.
    std::string_view takeName() {
        return takeWhile([](char c) { return isNameCharacter(c); });
    }
    std::string_view takeNumber() {
        return takeWhile([](char c) { return isDigit(c); });
    }
    /// A quoted text; its content, or nothing taken.
    bool takeLiteral(std::string_view& content) {
        skipSpace();
        if (m_rest.empty() || (m_rest[0] != '"' && m_rest[0] != '\''))
            return false;
        const std::size_t end = m_rest.find(m_rest[0], 1);
        if (end == std::string_view::npos)
            return false;
        content = m_rest.substr(1, end - 1);
        m_rest.remove_prefix(end + 1);
        return true;
    }

private:
    static bool isSpace(char c) { return c == ' ' || c == '\t' || c == '\n' || c == '\r'; }
    static bool isDigit(char c) { return c >= '0' && c <= '9'; }
    static bool isNameCharacter(char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || isDigit(c) || c == '_' ||
               c == '-' || c == ':' || static_cast<unsigned char>(c) >= 0x80;
    }
    void skipSpace() {
        while (!m_rest.empty() && isSpace(m_rest[0]))
            m_rest.remove_prefix(1);
    }
    template <class Accepts>
    std::string_view takeWhile(Accepts accepts) {
        skipSpace();
        std::size_t length = 0;
        while (length < m_rest.size() && accepts(m_rest[length]))
            ++length;
        const std::string_view taken = m_rest.substr(0, length);
        m_rest.remove_prefix(taken.size());
        return taken;
    }

    std::string_view m_rest;
};

}  // namespace parvel
