#pragma once

#include <map>
#include <mutex>
#include <string>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// The attributes of a whole library by the assets' identities, in a file: lines of JSON as
/// `attributes --jsonl` prints them, in the order of the identities.
class KeptAttributes {
public:
    /// Reads lines, an array, or a property list of such results. Throws UsageError, which names
    /// the option.
    void read(const std::string& file);
    /// Gives the errno value of a step that failed, else 0.
    [[nodiscard]] int write(const std::string& file) const;

    [[nodiscard]] bool isEmpty() const { return m_attributes.empty(); }
    /// Callable from many threads.
    void add(const String& assetID, Dictionary attributes);
    /// Null where none are kept for the asset.
    [[nodiscard]] const Dictionary* find(const String& assetID) const;

private:
    std::mutex m_mutex;
    std::map<String, Dictionary, std::less<>> m_attributes;
};

}  // namespace parvel::cli
