#include "parvel/platform/linux/XmlElementTree.h"

#include <algorithm>
#include <functional>
#include <utility>

#include "parvel/platform/linux/PlainXmlParse.h"

namespace parvel {
namespace {

constexpr std::size_t kLargestForeseen = 64 << 10;
constexpr std::size_t kUsualDepth = 16;

template <class T>
const T* itemOf(const std::vector<T>& items, const void* pointer) {
    const T* item = static_cast<const T*>(pointer);
    const std::less<const T*> before;
    const bool isInside = !before(item, items.data()) && before(item, items.data() + items.size());
    return isInside ? item : nullptr;
}

}  // namespace

/// Fills a tree's lists in document order.
class XmlElementTree::Builder {
public:
    explicit Builder(std::size_t documentSize) {
        // About what a package document holds, so that the lists of most need not grow.
        const std::size_t size = std::min(documentSize, kLargestForeseen);
        m_tree.m_elements.reserve(size / 32);
        m_tree.m_attributes.reserve(size / 24);
        m_tree.m_text.reserve(size / 2);
        m_open.reserve(kUsualDepth);
    }

    void begin(std::string_view name, std::string_view namespaceName) {
        m_open.push_back(static_cast<std::uint32_t>(m_tree.m_elements.size()));
        Element& element = m_tree.m_elements.emplace_back();
        element.name = name;
        element.namespaceName = namespaceName;
        element.textBegin = static_cast<std::uint32_t>(m_tree.m_text.size());
        element.attributesBegin = static_cast<std::uint32_t>(m_tree.m_attributes.size());
        element.attributesEnd = element.attributesBegin;
    }

    /// Of the element that was begun last.
    void add(std::string_view name, std::string_view namespaceName, std::string_view value) {
        Attribute& attribute = m_tree.m_attributes.emplace_back();
        attribute.name = name;
        attribute.namespaceName = namespaceName;
        attribute.value = value;
        ++m_tree.m_elements.back().attributesEnd;
    }

    void add(std::string_view characters) { m_tree.m_text += characters; }

    void end() {
        Element& element = m_tree.m_elements[m_open.back()];
        element.end = static_cast<std::uint32_t>(m_tree.m_elements.size());
        element.textEnd = static_cast<std::uint32_t>(m_tree.m_text.size());
        m_open.pop_back();
    }

    XmlElementTree& tree() { return m_tree; }

private:
    XmlElementTree m_tree;
    std::vector<std::uint32_t> m_open;
};

class XmlElementTree::PlainParse : private PlainXmlParse {
public:
    explicit PlainParse(const Data& bytes) : m_bytes(bytes), m_builder(bytes.size()) {}

    std::optional<XmlElementTree> run() {
        XmlElementTree& tree = m_builder.tree();
        if (!PlainXmlParse::run(m_bytes.text(tree.m_joinedBytes)))
            return std::nullopt;
        tree.m_bytes = m_bytes;
        tree.m_values = takeValues();
        return std::move(tree);
    }

private:
    void startElement(const StartTag& tag) override {
        m_builder.begin(tag.name.local, tag.namespaceName);
        for (const PlainXmlParse::Attribute& attribute : tag.attributes)
            m_builder.add(attribute.name.local, attribute.namespaceName, attribute.value);
    }
    void endElement() override { m_builder.end(); }
    void text(std::string_view characters) override { m_builder.add(characters); }

    const Data& m_bytes;
    Builder m_builder;
};

class XmlElementTree::GuardedParse : private GuardedXmlParse {
public:
    explicit GuardedParse(const Data& bytes)
        : m_bytes(bytes), m_budget(bytes.size()), m_builder(bytes.size()) {}

    std::optional<XmlElementTree> run() {
        if (!GuardedXmlParse::run(m_bytes, 0))
            return std::nullopt;
        XmlElementTree& tree = m_builder.tree();
        xmlDictReference(parser()->dict);
        tree.m_names.reset(parser()->dict);
        tree.m_values = std::move(m_values);
        tree.m_scope = m_budget.scope();
        return std::move(tree);
    }

private:
    void startElement(const StartTag& tag) override {
        if (!m_budget.startElement(*parser(), tag))
            return stop();
        m_builder.begin(fullName(tag.name, tag.prefix, tag.namespaceName),
                        textOf(tag.namespaceName));
        for (std::size_t slot = 0; slot < tag.attributes.size(); slot += 5)
            addAttribute(tag.attributes.subspan(slot, 5));
    }

    void addAttribute(std::span<const xmlChar*> slots) {
        const std::string_view value(reinterpret_cast<const char*>(slots[3]),
                                     static_cast<std::size_t>(slots[4] - slots[3]));
        m_builder.add(fullName(slots[0], slots[1], slots[2]), textOf(slots[2]),
                      m_values.keep(value));
    }

    /// A prefix that is not declared stays part of the name, as in libxml2's tree.
    std::string_view fullName(const xmlChar* name, const xmlChar* prefix,
                              const xmlChar* namespaceName) const {
        return textOf(prefix && !namespaceName ? xmlDictQLookup(parser()->dict, prefix, name)
                                               : name);
    }

    static std::string_view textOf(const xmlChar* text) {
        return text ? reinterpret_cast<const char*>(text) : std::string_view();
    }

    void endElement() override {
        m_budget.endElement();
        m_builder.end();
    }

    void text(std::string_view characters) override {
        if (!m_budget.text(*parser(), characters))
            return stop();
        m_builder.add(characters);
    }

    void comment(const xmlChar* text) override { remark(text); }
    void processingInstruction(const xmlChar*, const xmlChar* data) override { remark(data); }

    void remark(const xmlChar* content) {
        if (!m_budget.remark(*parser(), content))
            stop();
    }

    const Data& m_bytes;
    XmlTreeBudget m_budget;
    TextArena m_values;
    Builder m_builder;
};

std::optional<XmlElementTree> XmlElementTree::parse(const Data& bytes) {
    std::optional<XmlElementTree> tree = parsePlain(bytes);
    return tree ? std::move(tree) : parseGuarded(bytes);
}

std::optional<XmlElementTree> XmlElementTree::parsePlain(const Data& bytes) {
    if (bytes.size() > PlainXmlParse::kLargestDocument)
        return std::nullopt;
    return PlainParse(bytes).run();
}

std::optional<XmlElementTree> XmlElementTree::parseGuarded(const Data& bytes) {
    return GuardedParse(bytes).run();
}

const XmlElementTree::Element* XmlElementTree::elementAt(const void* node) const {
    return itemOf(m_elements, node);
}

const XmlElementTree::Attribute* XmlElementTree::attributeAt(const void* node) const {
    return itemOf(m_attributes, node);
}

std::uint32_t XmlElementTree::indexOf(const Element& element) const {
    return static_cast<std::uint32_t>(&element - m_elements.data());
}

const XmlElementTree::Element& XmlElementTree::ownerOf(const Attribute& attribute) const {
    const auto index = static_cast<std::uint32_t>(&attribute - m_attributes.data());
    return *std::upper_bound(
        m_elements.begin(), m_elements.end(), index,
        [](std::uint32_t at, const Element& element) { return at < element.attributesEnd; });
}

const XmlElementTree::Attribute* XmlElementTree::attribute(const Element& element,
                                                           std::string_view name) const {
    for (std::uint32_t index = element.attributesBegin; index < element.attributesEnd; ++index) {
        const Attribute& attribute = m_attributes[index];
        if (attribute.namespaceName.empty() && attribute.name == name)
            return &attribute;
    }
    return nullptr;
}

std::string_view XmlElementTree::text(const Element& element) const {
    return std::string_view(m_text).substr(element.textBegin, element.textEnd - element.textBegin);
}

}  // namespace parvel
