#pragma once

#include <cstddef>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/Date.h"
#include "parvel/foundation/Number.h"
#include "parvel/foundation/PVExport.h"

namespace parvel {

class Array;
class Dictionary;

/// The run-time kind of a Value; the four kinds of Number are one.
enum class TypeID { Null, Number, String, Date, Data, Array, Dictionary };

/// Text in UTF-8. Lengths and cuts are counted in UTF-16 units throughout the library.
using String = std::string;

/// The null marker of update dictionaries: comparable, and in no property list.
struct Null {
    friend bool operator==(const Null&, const Null&) = default;
};

/// One property-list value, or the null marker. Arrays and dictionaries are immutable behind a
/// shared pointer, so a copy is cheap. `as<T>()` looks at the value; absent values are null
/// pointers to Value, never a kind of Value. What was moved from is only to be assigned to or
/// destroyed.
class PV_EXPORT Value {
public:
    Value() = default;  ///< the null marker
    Value(Null null) : m_storage(null) {}
    Value(Number number) : m_storage(number) {}
    Value(String text) : m_storage(std::move(text)) {}
    Value(std::string_view text) : m_storage(String(text)) {}
    Value(const char* text) : m_storage(String(text)) {}
    Value(std::nullptr_t) = delete;
    Value(Date date) : m_storage(date) {}
    Value(Data data) : m_storage(std::move(data)) {}
    Value(Array array);
    Value(Dictionary dictionary);
    /// These share the container without a copy; null is not allowed.
    Value(std::shared_ptr<const Dictionary> dictionary) : m_storage(std::move(dictionary)) {}
    Value(std::shared_ptr<const Array> array) : m_storage(std::move(array)) {}
    Value(const Value&) = default;
    Value(Value&&) noexcept = default;
    /// The other may lie within this value.
    Value& operator=(const Value& other) { return *this = Value(other); }
    Value& operator=(Value&&) noexcept = default;
    /// Frees nested containers without recursion, however deep they are.
    ~Value();

    [[nodiscard]] TypeID typeID() const { return static_cast<TypeID>(m_storage.index()); }

    /// The value as a T (Null, Number, String, Date, Data, Array or Dictionary), or null where it
    /// is of another kind.
    template <class T>
    [[nodiscard]] const T* as() const {
        if constexpr (std::is_same_v<T, Array> || std::is_same_v<T, Dictionary>) {
            const auto* shared = std::get_if<std::shared_ptr<const T>>(&m_storage);
            return shared ? shared->get() : nullptr;
        } else {
            return std::get_if<T>(&m_storage);
        }
    }

    /// Of a container its size alone, so that hashing never descends.
    [[nodiscard]] std::size_t hash() const;
    /// Deep equality, without recursion; numbers compare by value, and values of different kinds
    /// are never equal.
    PV_EXPORT friend bool operator==(const Value& left, const Value& right);

private:
    using Storage = std::variant<Null, Number, String, Date, Data, std::shared_ptr<const Array>,
                                 std::shared_ptr<const Dictionary>>;
    Storage m_storage;
};

/// A list of values.
class PV_EXPORT Array {
public:
    Array() = default;
    Array(std::initializer_list<Value> values) : m_values(values) {}
    explicit Array(std::vector<Value> values) : m_values(std::move(values)) {}

    [[nodiscard]] std::size_t size() const { return m_values.size(); }
    [[nodiscard]] bool empty() const { return m_values.empty(); }
    [[nodiscard]] const Value& operator[](std::size_t index) const { return m_values[index]; }
    [[nodiscard]] auto begin() const { return m_values.begin(); }
    [[nodiscard]] auto end() const { return m_values.end(); }
    /// The values, for a caller that takes the array apart.
    [[nodiscard]] std::vector<Value> takeValues() && { return std::move(m_values); }

    friend bool operator==(const Array&, const Array&) = default;

private:
    std::vector<Value> m_values;
};

/// A string-keyed dictionary whose entries stand in the byte order of their keys, so that files and
/// descriptions come out the same every time.
class PV_EXPORT Dictionary {
public:
    struct Entry {
        String key;
        Value value;
        friend bool operator==(const Entry&, const Entry&) = default;
    };

    Dictionary() = default;
    Dictionary(std::initializer_list<Entry> entries) : Dictionary(std::vector<Entry>(entries)) {}
    /// In any order; the last of several entries with one key wins.
    explicit Dictionary(std::vector<Entry> entries);

    [[nodiscard]] std::size_t size() const { return m_entries.size(); }
    [[nodiscard]] bool empty() const { return m_entries.empty(); }
    [[nodiscard]] auto begin() const { return m_entries.begin(); }
    [[nodiscard]] auto end() const { return m_entries.end(); }

    /// The value under the key, null when absent; valid until the dictionary changes.
    [[nodiscard]] const Value* find(std::string_view key) const;
    [[nodiscard]] bool contains(std::string_view key) const { return find(key) != nullptr; }

    void set(std::string_view key, Value value);
    /// Makes room for so many entries in all.
    void reserve(std::size_t entries) { m_entries.reserve(entries); }
    void remove(std::string_view key);
    /// Copies every entry of the other dictionary over this one's.
    void merge(const Dictionary& other);
    /// A copy without the entries under the given keys.
    [[nodiscard]] Dictionary without(std::initializer_list<std::string_view> keys) const;
    /// The entries, for a caller that takes the dictionary apart.
    [[nodiscard]] std::vector<Entry> takeEntries() && { return std::move(m_entries); }

    [[nodiscard]] std::size_t hash() const;
    friend bool operator==(const Dictionary&, const Dictionary&) = default;

private:
    std::vector<Entry> m_entries;  ///< sorted by key, each key once
};

/// The value's one-line text for logs: dictionaries as `{key = value; …}`, strings quoted, keys
/// not, both with `\"`, `\\` and `\n` escaped, data as `<N bytes>`, dates in ISO form (UTC), the
/// null marker as `<null>`, arrays as `(a, b)`. A date that has no ISO form prints as its number of
/// seconds, and containers below the 512th level as `(…)` and `{…}`.
PV_EXPORT String description(const Value& value);
PV_EXPORT String description(const Dictionary& dictionary);

}  // namespace parvel
