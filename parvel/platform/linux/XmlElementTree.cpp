#include "parvel/platform/linux/XmlElementTree.h"

#include <algorithm>
#include <functional>
#include <utility>

namespace parvel {
namespace {

constexpr std::size_t kLargestForeseen = 16 << 10;
constexpr std::size_t kUsualDepth = 16;

template <class T>
const T* itemOf(const std::vector<T>& items, const void* pointer) {
    const T* item = static_cast<const T*>(pointer);
    const std::less<const T*> before;
    const bool isInside = !before(item, items.data()) && before(item, items.data() + items.size());
    return isInside ? item : nullptr;
}

}  // namespace

class XmlElementTree::Parse : private GuardedXmlParse {
public:
    explicit Parse(const Data& bytes) : m_bytes(bytes), m_budget(bytes.size()) {
        // About what a package document holds, so that the lists of most need not grow.
        const std::size_t size = std::min(bytes.size(), kLargestForeseen);
        m_tree.m_elements.reserve(size / 64);
        m_tree.m_attributes.reserve(size / 32);
        m_tree.m_values.reserve(size / 2);
        m_tree.m_text.reserve(size / 2);
        m_open.reserve(kUsualDepth);
    }

    std::optional<XmlElementTree> run() {
        if (!GuardedXmlParse::run(m_bytes, 0))
            return std::nullopt;
        xmlDictReference(parser()->dict);
        m_tree.m_names.reset(parser()->dict);
        m_tree.m_scope = m_budget.scope();
        return std::move(m_tree);
    }

private:
    void startElement(const StartTag& tag) override {
        if (!m_budget.startElement(*parser(), tag))
            return stop();
        m_open.push_back(static_cast<std::uint32_t>(m_tree.m_elements.size()));
        Element& element = m_tree.m_elements.emplace_back();
        element.name = fullName(tag.name, tag.prefix, tag.namespaceName);
        element.namespaceName = tag.namespaceName;
        element.textBegin = static_cast<std::uint32_t>(m_tree.m_text.size());
        element.attributesBegin = static_cast<std::uint32_t>(m_tree.m_attributes.size());
        for (std::size_t slot = 0; slot < tag.attributes.size(); slot += 5)
            addAttribute(tag.attributes.subspan(slot, 5));
        element.attributesEnd = static_cast<std::uint32_t>(m_tree.m_attributes.size());
    }

    void addAttribute(std::span<const xmlChar*> slots) {
        const auto begin = static_cast<std::uint32_t>(m_tree.m_values.size());
        m_tree.m_values.append(reinterpret_cast<const char*>(slots[3]),
                               static_cast<std::size_t>(slots[4] - slots[3]));
        const auto end = static_cast<std::uint32_t>(m_tree.m_values.size());
        m_tree.m_attributes.push_back(
            {fullName(slots[0], slots[1], slots[2]), slots[2], begin, end});
    }

    /// A prefix that is not declared stays part of the name, as in libxml2's tree.
    const xmlChar* fullName(const xmlChar* name, const xmlChar* prefix,
                            const xmlChar* namespaceName) const {
        return prefix && !namespaceName ? xmlDictQLookup(parser()->dict, prefix, name) : name;
    }

    void endElement() override {
        m_budget.endElement();
        Element& element = m_tree.m_elements[m_open.back()];
        element.end = static_cast<std::uint32_t>(m_tree.m_elements.size());
        element.textEnd = static_cast<std::uint32_t>(m_tree.m_text.size());
        m_open.pop_back();
    }

    void text(std::string_view characters) override {
        if (!m_budget.text(*parser(), characters))
            return stop();
        m_tree.m_text += characters;
    }

    void comment(const xmlChar* text) override { remark(text); }
    void processingInstruction(const xmlChar*, const xmlChar* data) override { remark(data); }

    void remark(const xmlChar* content) {
        if (!m_budget.remark(*parser(), content))
            stop();
    }

    const Data& m_bytes;
    XmlTreeBudget m_budget;
    XmlElementTree m_tree;
    std::vector<std::uint32_t> m_open;
};

std::optional<XmlElementTree> XmlElementTree::parse(const Data& bytes) {
    return Parse(bytes).run();
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
        if (!attribute.namespaceName && name == reinterpret_cast<const char*>(attribute.name))
            return &attribute;
    }
    return nullptr;
}

std::string_view XmlElementTree::value(const Attribute& attribute) const {
    return std::string_view(m_values).substr(attribute.valueBegin,
                                             attribute.valueEnd - attribute.valueBegin);
}

std::string_view XmlElementTree::text(const Element& element) const {
    return std::string_view(m_text).substr(element.textBegin, element.textEnd - element.textBegin);
}

}  // namespace parvel
