#include "parvel/platform/linux/LocationPath.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <span>

#include "parvel/platform/linux/XPathScanner.h"

namespace parvel {
namespace {

constexpr std::size_t kMaximumSteps = 16;
constexpr std::size_t kUsualSteps = 4;

bool isNameStart(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}

/// A name without a colon, of the characters that every edition of XML allows.
bool isPlainName(std::string_view name) {
    return !name.empty() && isNameStart(name[0]) &&
           std::all_of(name.begin(), name.end(),
                       [](char c) { return static_cast<unsigned char>(c) < 0x80 && c != ':'; });
}

/// Others may be no characters of XML, which libxml2 tells.
bool isPlainText(std::string_view text) {
    return std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c <= '~'; });
}

}  // namespace

class LocationPath::Reader {
public:
    Reader(std::string_view expression, const Bindings& bindings)
        : m_scanner(expression), m_bindings(bindings) {}

    std::optional<LocationPath> read() {
        LocationPath path;
        path.m_isAbsolute = m_scanner.take("/");
        path.m_steps.reserve(kUsualSteps);
        do {
            if (path.m_steps.size() == kMaximumSteps || !readStep(path.m_steps.emplace_back()))
                return std::nullopt;
        } while (!path.m_steps.back().isAttribute && m_scanner.take("/"));
        if (!m_scanner.atEnd())
            return std::nullopt;
        return path;
    }

private:
    bool readStep(Step& step) {
        step.isAttribute = m_scanner.take("@");
        const std::string_view name = m_scanner.takeName();
        const std::size_t colon = name.find(':');
        step.name = colon == std::string_view::npos ? name : name.substr(colon + 1);
        if (!isPlainName(step.name))
            return false;
        if (colon != std::string_view::npos) {
            step.namespaceName = boundTo(name.substr(0, colon));
            if (step.namespaceName.empty() || step.isAttribute)
                return false;
        }
        while (m_scanner.take("[")) {
            if (step.isAttribute || !readPredicate(step))
                return false;
        }
        return true;
    }

    std::string_view boundTo(std::string_view prefix) const {
        const auto binding = std::find_if(m_bindings.rbegin(), m_bindings.rend(),
                                          [&](const auto& bound) { return bound.first == prefix; });
        return binding == m_bindings.rend() ? std::string_view() : binding->second;
    }

    bool readPredicate(Step& step) {
        if (step.predicateCount == maximumPredicates)
            return false;
        Predicate& predicate = step.predicates[step.predicateCount++];
        if (m_scanner.take("@")) {
            predicate.attribute = m_scanner.takeName();
            if (!isPlainName(predicate.attribute) || !m_scanner.take("=") ||
                !m_scanner.takeLiteral(predicate.value) || !isPlainText(predicate.value))
                return false;
        } else {
            const std::string_view digits = m_scanner.takeNumber();
            const auto [end, error] =
                std::from_chars(digits.data(), digits.data() + digits.size(), predicate.position);
            if (error != std::errc() || predicate.position == 0)
                return false;
        }
        return m_scanner.take("]");
    }

    XPathScanner m_scanner;
    const Bindings& m_bindings;
};

/// Goes into depth by one level a step.
class LocationPath::Search {
public:
    explicit Search(const XmlElementTree& tree) : m_tree(tree) {}

    const void* firstOf(const XmlElementTree::Element* parent, std::span<const Step> steps) const {
        const Step& step = steps.front();
        if (step.isAttribute)
            return parent ? m_tree.attribute(*parent, step.name) : nullptr;

        const std::vector<XmlElementTree::Element>& elements = m_tree.elements();
        std::uint32_t child = parent ? m_tree.indexOf(*parent) + 1 : 0;
        const auto end = parent ? parent->end : static_cast<std::uint32_t>(elements.size());
        std::array<std::uint32_t, maximumPredicates> counts{};
        for (; child < end; child = elements[child].end) {
            const XmlElementTree::Element& element = elements[child];
            if (!hasName(element, step) || !passes(element, step, counts))
                continue;
            const void* found = steps.size() == 1 ? &element : firstOf(&element, steps.subspan(1));
            if (found)
                return found;
        }
        return nullptr;
    }

private:
    static bool hasName(const XmlElementTree::Element& element, const Step& step) {
        return element.name == step.name && element.namespaceName == step.namespaceName;
    }

    /// A position counts the elements that passed the predicates before it.
    bool passes(const XmlElementTree::Element& element, const Step& step,
                std::span<std::uint32_t> counts) const {
        for (std::size_t index = 0; index < step.predicateCount; ++index) {
            const Predicate& predicate = step.predicates[index];
            if (predicate.position != 0) {
                if (++counts[index] != predicate.position)
                    return false;
                continue;
            }
            const XmlElementTree::Attribute* attribute =
                m_tree.attribute(element, predicate.attribute);
            if (!attribute || attribute->value != predicate.value)
                return false;
        }
        return true;
    }

    const XmlElementTree& m_tree;
};

std::optional<LocationPath> LocationPath::parse(std::string_view expression,
                                                const Bindings& bindings) {
    // libxml2 takes the text up to a NUL for the whole of it.
    if (expression.find('\0') != std::string_view::npos)
        return std::nullopt;
    return Reader(expression, bindings).read();
}

const void* LocationPath::firstIn(const XmlElementTree& tree,
                                  const XmlElementTree::Element* context) const {
    return Search(tree).firstOf(m_isAbsolute ? nullptr : context, m_steps);
}

}  // namespace parvel
