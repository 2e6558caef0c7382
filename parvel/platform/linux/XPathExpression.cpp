#include "parvel/platform/linux/XPathExpression.h"

#include <algorithm>
#include <cstdint>

namespace parvel {
namespace {

constexpr std::size_t kMaximumLength = 4096;
constexpr std::size_t kFreeOperations = 50'000'000;
constexpr std::uint64_t kMaximumWork = 2'000'000'000;
constexpr std::uint64_t kMaximumTextMemory = 64 << 20;

bool isSpace(char c) {
    return c == ' ' || c == '\t' || c == '\n' || c == '\r';
}

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

/// Any character of a name, the colon of a qualified one too.
bool isNameCharacter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || isDigit(c) || c == '_' || c == '-' ||
           c == ':' || static_cast<unsigned char>(c) >= 0x80;
}

/// Takes pieces off the front of a text. Each `take` skips white space first.
class Scanner {
public:
    explicit Scanner(std::string_view text) : m_rest(text) {}

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
    std::string_view takeName() { return takeWhile(isNameCharacter); }
    bool takeNumber() { return !takeWhile(isDigit).empty(); }
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
    void skipSpace() {
        while (!m_rest.empty() && isSpace(m_rest[0]))
            m_rest.remove_prefix(1);
    }
    std::string_view takeWhile(bool (*accepts)(char)) {
        skipSpace();
        const auto end = std::find_if_not(m_rest.begin(), m_rest.end(), accepts);
        const std::string_view taken(m_rest.begin(), end);
        m_rest.remove_prefix(taken.size());
        return taken;
    }

    std::string_view m_rest;
};

bool takeOperand(Scanner& scanner) {
    std::string_view content;
    if (scanner.takeLiteral(content))
        return true;
    return scanner.take("@") ? !scanner.takeName().empty() : scanner.takeNumber();
}

/// A position, or tests of attributes joined by `and` and `or`.
bool takePlainPredicate(Scanner& scanner) {
    do {
        if (!takeOperand(scanner) || (scanner.take("=") && !takeOperand(scanner)))
            return false;
    } while (scanner.take("or") || scanner.take("and"));
    return scanner.take("]");
}

bool isPlain(std::string_view expression) {
    Scanner scanner(expression);
    scanner.take("/");
    do {
        scanner.take("@");
        const std::string_view name = scanner.takeName();
        const bool isName = !name.empty() && name.find("::") == std::string_view::npos;
        if (!isName && !(name.empty() && scanner.take("*")))
            return false;
        while (scanner.take("[")) {
            if (!takePlainPredicate(scanner))
                return false;
        }
    } while (scanner.take("/"));
    return scanner.atEnd();
}

/// Whether it may use a function that compares one text with another at every place.
bool searchesText(std::string_view expression) {
    for (const std::string_view function : {"contains", "substring-", "translate"}) {
        if (expression.find(function) != std::string_view::npos)
            return true;
    }
    return false;
}

}  // namespace

XPathText splitPrologue(std::string_view text) {
    XPathText result;
    Scanner scanner(text);
    std::string_view rest = text;
    while (scanner.take("declare namespace ")) {
        const std::string_view prefix = scanner.takeName();
        std::string_view name;
        if (prefix.empty() || !scanner.take("=") || !scanner.takeLiteral(name) ||
            !scanner.take(";"))
            break;
        result.bindings.emplace_back(prefix, name);
        rest = scanner.rest();
    }
    result.prologue = text.substr(0, text.size() - rest.size());
    result.expression = rest;
    return result;
}

std::size_t xpathOperationLimit(std::string_view expression, const XPathScope& scope) {
    if (expression.size() > kMaximumLength)
        return 0;
    if (isPlain(expression))
        return kFreeOperations;
    const std::uint64_t text = scope.textBytes + expression.size();
    if (text * std::max<std::uint64_t>(scope.depth, expression.size()) > kMaximumTextMemory)
        return 0;
    // Sorting and comparing visit the siblings of each node.
    const std::uint64_t cost = (searchesText(expression) ? text * text : text) + 20 * scope.nodes;
    return static_cast<std::size_t>(kMaximumWork / std::max<std::uint64_t>(cost, 1));
}

}  // namespace parvel
