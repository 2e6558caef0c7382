#include "parvel/platform/linux/XPathExpression.h"

#include <algorithm>
#include <cstdint>

#include "parvel/platform/linux/XPathScanner.h"

namespace parvel {
namespace {

constexpr std::string_view kDeclaration = "declare namespace ";
constexpr std::size_t kMaximumLength = 4096;
constexpr std::size_t kFreeOperations = 50'000'000;
constexpr std::uint64_t kMaximumWork = 2'000'000'000;
constexpr std::uint64_t kMaximumTextMemory = 64 << 20;

bool takeOperand(XPathScanner& scanner) {
    std::string_view content;
    if (scanner.takeLiteral(content))
        return true;
    return scanner.take("@") ? !scanner.takeName().empty() : !scanner.takeNumber().empty();
}

/// A position, or tests of attributes joined by `and` and `or`.
bool takePlainPredicate(XPathScanner& scanner) {
    do {
        if (!takeOperand(scanner) || (scanner.take("=") && !takeOperand(scanner)))
            return false;
    } while (scanner.take("or") || scanner.take("and"));
    return scanner.take("]");
}

bool isPlain(std::string_view expression) {
    XPathScanner scanner(expression);
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
    XPathScanner scanner(text);
    std::string_view rest = text;
    while (scanner.take(kDeclaration)) {
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

const XPathText& XPathSplitter::split(std::string_view text) {
    const bool isRepeated = text.starts_with(m_prologue) &&
                            !XPathScanner(text.substr(m_prologue.size())).take(kDeclaration);
    if (!isRepeated) {
        m_prologue = splitPrologue(text).prologue;
        m_text = splitPrologue(m_prologue);
    }
    m_text.expression = text.substr(m_prologue.size());
    return m_text;
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
