#include <array>
#include <string>
#include <utility>
#include <vector>

#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/linux/GuardedXmlParse.h"
#include "parvel/platform/linux/PlainXmlParse.h"
#include "parvel/platform/linux/PropertyListForms.h"

namespace parvel {
namespace {

/// More names than the form and its few attributes have.
constexpr int kMaximumXMLNames = 10'000;

enum class Tag { Plist, Dictionary, Array, Key, String, Integer, Real, Date, Data, True, False };

constexpr std::array<std::pair<std::string_view, Tag>, 11> kTags{{
    {"plist", Tag::Plist},
    {"dict", Tag::Dictionary},
    {"array", Tag::Array},
    {"key", Tag::Key},
    {"string", Tag::String},
    {"integer", Tag::Integer},
    {"real", Tag::Real},
    {"date", Tag::Date},
    {"data", Tag::Data},
    {"true", Tag::True},
    {"false", Tag::False},
}};

std::optional<Tag> tagNamed(std::string_view name) {
    for (const auto& [known, tag] : kTags) {
        if (known == name)
            return tag;
    }
    return std::nullopt;
}

bool isContainer(Tag tag) {
    return tag == Tag::Plist || tag == Tag::Dictionary || tag == Tag::Array;
}

bool isSpace(std::string_view text) {
    return text.find_first_not_of(" \t\r\n") == std::string_view::npos;
}

template <class T>
std::optional<Value> valueOf(std::optional<T> leaf) {
    return leaf ? std::optional<Value>(std::move(*leaf)) : std::nullopt;
}

/// Builds the values as their elements end. Each step tells whether the form allows it.
class PropertyListBuilder {
public:
    [[nodiscard]] bool begin(std::string_view name) {
        const std::optional<Tag> tag = tagNamed(name);
        if (!tag || !mayStandHere(*tag))
            return false;
        if (*tag != Tag::Plist && ++m_nodes > kMaximumPropertyListNodes)
            throw MalformedInput("a property list of too many values");
        if (isContainer(*tag) && *tag != Tag::Plist && ++m_depth > kMaximumPropertyListDepth)
            throw MalformedInput("a property list nested too deep");
        m_open.push_back({*tag, {}, {}, std::nullopt});
        m_text.clear();
        return true;
    }

    [[nodiscard]] bool end() {
        Open ended = std::move(m_open.back());
        m_open.pop_back();
        if (ended.tag == Tag::Plist)
            return true;
        if (ended.tag == Tag::Key) {
            m_open.back().key = std::move(m_text);
            return true;
        }
        if (isContainer(ended.tag))
            --m_depth;
        std::optional<Value> value = valueOfElement(std::move(ended));
        if (!value)
            return false;
        place(std::move(*value));
        return true;
    }

    [[nodiscard]] bool add(std::string_view characters) {
        if (m_open.empty() || isContainer(m_open.back().tag))
            return isSpace(characters);
        m_text += characters;
        return true;
    }

    [[nodiscard]] std::optional<Value> takeResult() { return std::move(m_result); }

private:
    struct Open {
        Tag tag;
        std::vector<Value> values;               ///< of a list
        std::vector<Dictionary::Entry> entries;  ///< of a dictionary
        std::optional<String> key;               ///< the dictionary's last one, without its value
    };

    bool mayStandHere(Tag tag) const {
        if (m_open.empty())
            return tag != Tag::Key;
        const Open& parent = m_open.back();
        if (parent.tag == Tag::Dictionary)
            return tag != Tag::Plist && (tag == Tag::Key) == !parent.key;
        return isContainer(parent.tag) && tag != Tag::Plist && tag != Tag::Key &&
               (parent.tag == Tag::Array || !m_result);
    }

    std::optional<Value> valueOfElement(Open&& ended) {
        switch (ended.tag) {
            case Tag::Dictionary:
                if (ended.key)
                    return std::nullopt;
                return Dictionary(std::move(ended.entries));
            case Tag::Array:
                return Array(std::move(ended.values));
            case Tag::String:
                return std::move(m_text);
            case Tag::Integer:
                return valueOf(integerFromText(m_text));
            case Tag::Real:
                return valueOf(realFromText(m_text));
            case Tag::Date:
                return valueOf(dateFromText(m_text));
            case Tag::Data:
                return valueOf(dataFromBase64(m_text));
            case Tag::True:
            case Tag::False:
                if (!isSpace(m_text))
                    return std::nullopt;
                return Number::boolean(ended.tag == Tag::True);
            case Tag::Plist:
            case Tag::Key:
                break;
        }
        return std::nullopt;
    }

    void place(Value value) {
        if (m_open.empty() || m_open.back().tag == Tag::Plist) {
            m_result = std::move(value);
            return;
        }
        Open& parent = m_open.back();
        if (parent.tag == Tag::Array) {
            parent.values.push_back(std::move(value));
            return;
        }
        parent.entries.push_back({std::move(*parent.key), std::move(value)});
        parent.key.reset();
    }

    std::vector<Open> m_open;  ///< the elements that have not ended, outermost first
    std::string m_text;        ///< of the leaf that has not ended
    std::size_t m_depth = 0;
    std::size_t m_nodes = 0;
    std::optional<Value> m_result;
};

class PlainPropertyListParse : private PlainXmlParse {
public:
    std::optional<Value> run(std::string_view list) {
        return PlainXmlParse::run(list) ? m_builder.takeResult() : std::nullopt;
    }

private:
    void startElement(const StartTag& tag) override {
        // Attributes have a budget of their own, and only the root usually has any.
        const bool isPlain = tag.attributes.empty() || tag.name.local == "plist";
        take(isPlain && tag.name.prefix.empty() && m_builder.begin(tag.name.local));
    }
    void endElement() override { take(m_builder.end()); }
    void text(std::string_view characters) override { take(m_builder.add(characters)); }

    void take(bool isAllowed) {
        if (!isAllowed)
            refuse();
    }

    PropertyListBuilder m_builder;
};

class GuardedPropertyListParse : private GuardedXmlParse {
public:
    std::optional<Value> run(const Data& bytes) {
        // The parser's own limits are below what a property list may have; the builder keeps
        // others.
        return GuardedXmlParse::run(bytes, XML_PARSE_HUGE) ? m_builder.takeResult() : std::nullopt;
    }

private:
    void startElement(const StartTag& tag) override {
        take(!tag.prefix && xmlDictSize(parser()->dict) <= kMaximumXMLNames &&
             m_builder.begin(reinterpret_cast<const char*>(tag.name)));
    }
    void endElement() override { take(m_builder.end()); }
    void text(std::string_view characters) override { take(m_builder.add(characters)); }

    void take(bool isAllowed) {
        if (!isAllowed)
            stop();
    }

    PropertyListBuilder m_builder;
};

}  // namespace

std::optional<Value> readXMLPropertyList(const Data& bytes) {
    std::optional<Value> list = readPlainXMLPropertyList(bytes);
    return list ? std::move(list) : readGuardedXMLPropertyList(bytes);
}

std::optional<Value> readPlainXMLPropertyList(const Data& bytes) {
    if (bytes.size() > PlainXmlParse::kLargestDocument)
        return std::nullopt;
    std::vector<std::uint8_t> storage;
    return PlainPropertyListParse().run(bytes.text(storage));
}

std::optional<Value> readGuardedXMLPropertyList(const Data& bytes) {
    return GuardedPropertyListParse().run(bytes);
}

}  // namespace parvel
