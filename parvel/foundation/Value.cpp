#include "parvel/foundation/Value.h"

#include <algorithm>
#include <functional>
#include <iterator>

namespace parvel {
namespace {

/// How deep this thread is in freeing containers within each other, and where those beyond the
/// limit wait until the outermost one frees them.
struct FreeingState {
    int depth = 0;
    std::vector<std::shared_ptr<const void>>* waiting = nullptr;
};

constinit thread_local FreeingState t_freeing;
constexpr int kDeepestRecursiveFreeing = 64;

void freeOutermost(std::shared_ptr<const void> container) {
    std::vector<std::shared_ptr<const void>> waiting;
    t_freeing = {1, &waiting};
    container.reset();
    while (!waiting.empty()) {
        container = std::move(waiting.back());
        waiting.pop_back();
        container.reset();
    }
    t_freeing = {};
}

void freeContainer(std::shared_ptr<const void> container) {
    if (t_freeing.depth == 0)
        return freeOutermost(std::move(container));
    if (t_freeing.depth == kDeepestRecursiveFreeing)
        return t_freeing.waiting->push_back(std::move(container));
    ++t_freeing.depth;
    container.reset();
    --t_freeing.depth;
}

std::size_t combined(std::size_t hash, std::size_t next) {
    return hash * 1099511628211U + next;
}

/// Of a container only its kind and size, so that a hash never descends.
std::size_t shallowHash(const Value& value) {
    const auto kind = static_cast<std::size_t>(value.typeID());
    switch (value.typeID()) {
        case TypeID::Null:
            return kind;
        case TypeID::Number:
            return combined(kind, value.as<Number>()->hash());
        case TypeID::String:
            return combined(kind, std::hash<String>{}(*value.as<String>()));
        case TypeID::Date:
            return combined(kind, Number::real(value.as<Date>()->secondsSinceReferenceDate).hash());
        case TypeID::Data:
            return combined(kind, value.as<Data>()->hash());
        case TypeID::Array:
            return combined(kind, value.as<Array>()->size());
        case TypeID::Dictionary:
            return combined(kind, value.as<Dictionary>()->size());
    }
    return kind;
}

using ValuePair = std::pair<const Value*, const Value*>;

/// Whether two values of one kind are equal, but for the pairs of inner values that it adds.
bool areEqualButFor(std::vector<ValuePair>& inner, const Value& left, const Value& right) {
    if (const auto* array = left.as<Array>()) {
        const auto* other = right.as<Array>();
        if (array->size() != other->size())
            return false;
        for (std::size_t i = 0; array != other && i < array->size(); ++i)
            inner.emplace_back(&(*array)[i], &(*other)[i]);
        return true;
    }
    const auto* dictionary = left.as<Dictionary>();
    const auto* other = right.as<Dictionary>();
    if (dictionary == other)
        return true;
    return std::equal(dictionary->begin(), dictionary->end(), other->begin(), other->end(),
                      [&inner](const auto& leftEntry, const auto& rightEntry) {
                          inner.emplace_back(&leftEntry.value, &rightEntry.value);
                          return leftEntry.key == rightEntry.key;
                      });
}

bool areEqualScalars(const Value& left, const Value& right) {
    switch (left.typeID()) {
        case TypeID::Number:
            return *left.as<Number>() == *right.as<Number>();
        case TypeID::String:
            return *left.as<String>() == *right.as<String>();
        case TypeID::Date:
            return *left.as<Date>() == *right.as<Date>();
        case TypeID::Data:
            return *left.as<Data>() == *right.as<Data>();
        case TypeID::Null:
        case TypeID::Array:
        case TypeID::Dictionary:
            break;
    }
    return true;
}

bool isContainer(const Value& value) {
    return value.typeID() == TypeID::Array || value.typeID() == TypeID::Dictionary;
}

constexpr auto isKeyBefore = [](const Dictionary::Entry& entry, std::string_view key) {
    return entry.key < key;
};

void appendEscaped(String& text, const String& string) {
    for (char character : string) {
        if (character == '"' || character == '\\')
            text += '\\';
        if (character == '\n')
            text += "\\n";
        else
            text += character;
    }
}

void appendQuoted(String& text, const String& string) {
    text += '"';
    appendEscaped(text, string);
    text += '"';
}

void appendDescription(String& text, const Value& value, int depth);

constexpr int kDeepestDescription = 512;

void appendArray(String& text, const Array& array, int depth) {
    if (depth == kDeepestDescription) {
        text += "(…)";
        return;
    }
    text += '(';
    const char* separator = "";
    for (const Value& value : array) {
        text += separator;
        appendDescription(text, value, depth + 1);
        separator = ", ";
    }
    text += ')';
}

void appendDictionary(String& text, const Dictionary& dictionary, int depth) {
    if (depth == kDeepestDescription) {
        text += "{…}";
        return;
    }
    text += '{';
    const char* separator = "";
    for (const Dictionary::Entry& entry : dictionary) {
        text += separator;
        appendEscaped(text, entry.key);
        text += " = ";
        appendDescription(text, entry.value, depth + 1);
        separator = "; ";
    }
    text += '}';
}

void appendDate(String& text, const Date& date) {
    const String iso = isoText(date);
    text += iso.empty() ? Number::real(date.secondsSinceReferenceDate).stringValue() : iso;
}

void appendDescription(String& text, const Value& value, int depth) {
    switch (value.typeID()) {
        case TypeID::Null:
            text += "<null>";
            break;
        case TypeID::Number:
            text += value.as<Number>()->stringValue();
            break;
        case TypeID::String:
            appendQuoted(text, *value.as<String>());
            break;
        case TypeID::Date:
            appendDate(text, *value.as<Date>());
            break;
        case TypeID::Data:
            text.append("<").append(std::to_string(value.as<Data>()->size())).append(" bytes>");
            break;
        case TypeID::Array:
            appendArray(text, *value.as<Array>(), depth);
            break;
        case TypeID::Dictionary:
            appendDictionary(text, *value.as<Dictionary>(), depth);
            break;
    }
}

}  // namespace

Value::Value(Array array) : m_storage(std::make_shared<const Array>(std::move(array))) {}

Value::Value(Dictionary dictionary)
    : m_storage(std::make_shared<const Dictionary>(std::move(dictionary))) {}

Value::~Value() {
    if (auto* array = std::get_if<std::shared_ptr<const Array>>(&m_storage)) {
        if (*array)
            freeContainer(std::move(*array));
    } else if (auto* dictionary = std::get_if<std::shared_ptr<const Dictionary>>(&m_storage)) {
        if (*dictionary)
            freeContainer(std::move(*dictionary));
    }
}

std::size_t Value::hash() const {
    return shallowHash(*this);
}

bool operator==(const Value& left, const Value& right) {
    std::vector<ValuePair> pending;
    const auto areEqual = [&pending](const Value& a, const Value& b) {
        if (a.typeID() != b.typeID())
            return false;
        return isContainer(a) ? areEqualButFor(pending, a, b) : areEqualScalars(a, b);
    };

    if (!areEqual(left, right))
        return false;
    while (!pending.empty()) {
        const auto [innerLeft, innerRight] = pending.back();
        pending.pop_back();
        if (!areEqual(*innerLeft, *innerRight))
            return false;
    }
    return true;
}

Dictionary::Dictionary(std::vector<Entry> entries) : m_entries(std::move(entries)) {
    const auto byKey = [](const Entry& left, const Entry& right) { return left.key < right.key; };
    const auto outOfOrder = [](const Entry& left, const Entry& right) {
        return left.key >= right.key;
    };
    if (std::adjacent_find(m_entries.begin(), m_entries.end(), outOfOrder) == m_entries.end())
        return;

    std::stable_sort(m_entries.begin(), m_entries.end(), byKey);
    std::size_t kept = 0;
    for (std::size_t i = 0; i < m_entries.size(); ++i) {
        const bool isOverwritten =
            i + 1 < m_entries.size() && m_entries[i + 1].key == m_entries[i].key;
        if (isOverwritten)
            continue;
        if (kept != i)
            m_entries[kept] = std::move(m_entries[i]);
        ++kept;
    }
    m_entries.erase(m_entries.begin() + static_cast<std::ptrdiff_t>(kept), m_entries.end());
}

const Value* Dictionary::find(std::string_view key) const {
    const auto entry = std::lower_bound(begin(), end(), key, isKeyBefore);
    return entry != end() && entry->key == key ? &entry->value : nullptr;
}

void Dictionary::set(std::string_view key, Value value) {
    const auto entry = std::lower_bound(m_entries.begin(), m_entries.end(), key, isKeyBefore);
    if (entry != m_entries.end() && entry->key == key)
        entry->value = std::move(value);
    else
        m_entries.insert(entry, Entry{String(key), std::move(value)});
}

void Dictionary::remove(std::string_view key) {
    const auto entry = std::lower_bound(m_entries.begin(), m_entries.end(), key, isKeyBefore);
    if (entry != m_entries.end() && entry->key == key)
        m_entries.erase(entry);
}

void Dictionary::merge(const Dictionary& other) {
    if (other.empty() || &other == this)
        return;
    std::vector<Entry> merged;
    merged.reserve(size() + other.size());
    auto own = m_entries.begin();
    for (const Entry& theirs : other) {
        while (own != m_entries.end() && own->key < theirs.key)
            merged.push_back(std::move(*own++));
        const bool isInBoth = own != m_entries.end() && own->key == theirs.key;
        const String* text = isInBoth ? own->value.as<String>() : nullptr;
        const String* theirText = theirs.value.as<String>();
        // The same text need not be copied.
        if (text && theirText && *text == *theirText)
            merged.push_back(std::move(*own));
        else
            merged.push_back(theirs);
        if (isInBoth)
            ++own;
    }
    std::move(own, m_entries.end(), std::back_inserter(merged));
    m_entries = std::move(merged);
}

Dictionary Dictionary::without(std::initializer_list<std::string_view> keys) const {
    Dictionary rest;
    rest.m_entries.reserve(size());
    std::copy_if(begin(), end(), std::back_inserter(rest.m_entries), [&keys](const Entry& entry) {
        return std::find(keys.begin(), keys.end(), entry.key) == keys.end();
    });
    return rest;
}

std::size_t Dictionary::hash() const {
    std::size_t hash = size();
    for (const Entry& entry : m_entries)
        hash = combined(combined(hash, std::hash<String>{}(entry.key)), shallowHash(entry.value));
    return hash;
}

String description(const Value& value) {
    String text;
    appendDescription(text, value, 0);
    return text;
}

String description(const Dictionary& dictionary) {
    String text;
    appendDictionary(text, dictionary, 0);
    return text;
}

}  // namespace parvel
