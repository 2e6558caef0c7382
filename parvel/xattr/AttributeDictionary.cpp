#include "parvel/xattr/AttributeDictionary.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <string>
#include <utility>
#include <vector>

#include "parvel/foundation/PVParvelLog.h"
#include "parvel/platform/CloudStore.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XattrStore.h"
#include "parvel/xattr/AttributeText.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel {

namespace {

constexpr std::array readNames = {
    PNMetadataXattrAssetID,  PNMetadataXattrTitle,           PNMetadataXattrSortTitle,
    PNMetadataXattrAuthor,   PNMetadataXattrSortAuthor,      PNMetadataXattrGenre,
    PNMetadataXattrComments, PNMetadataXattrBookDescription, PNMetadataXattrYear,
    PNMetadataXattrExplicit, PNMetadataXattrLastOpened,      PNMetadataXattrFirstOpened,
    PNMetadataXattrRating,
};

/// Reads the attributes of one file in few calls to the host: those that the file's list does not
/// name need not be asked for, and a value of the usual length is read without asking for its size.
class AttributeReader {
public:
    explicit AttributeReader(URL carrier)
        : m_carrier(std::move(carrier)), m_store(Service<XattrStore>::current()) {
        m_isListed = m_carrier.isFileURL() && m_store.list(m_carrier.path(), m_listed) == 0;
    }

    [[nodiscard]] bool isListed() const { return m_isListed; }
    [[nodiscard]] bool isListedEmpty() const { return m_isListed && m_listed.empty(); }

    /// Whether asking for the attribute could give anything but its absence.
    [[nodiscard]] bool mayHold(std::string_view name) {
        m_name = name;
        return !m_isListed || !m_store.decorate(m_name) ||
               std::find(m_listed.begin(), m_listed.end(), m_name) != m_listed.end();
    }

    /// False when the attribute can't be read; no text when there is none.
    [[nodiscard]] bool read(std::string_view name, std::optional<String>& text) {
        std::array<std::byte, usualLength> value;
        std::size_t length = 0;
        m_name = name;
        const int errnoValue = m_carrier.isFileURL() && m_store.decorate(m_name)
                                   ? m_store.get(m_carrier.path(), m_name, value, length)
                                   : EINVAL;
        if (errnoValue != 0 && errnoValue != ENODATA)
            return pvamfm_extendedAttributeString_forKey_error(m_carrier, &text, name);
        if (errnoValue == 0)
            text = attributeText({reinterpret_cast<const char*>(value.data()), length});
        return true;
    }

private:
    static constexpr std::size_t usualLength = 512;

    URL m_carrier;
    XattrStore& m_store;
    std::vector<std::string> m_listed;
    bool m_isListed;
    std::string m_name;  ///< as the store takes it
};

/// Of the item itself, or of what stands for it. What can be listed stands there.
AttributeReader readerAtURL(const URL& url) {
    AttributeReader reader(url);
    const std::optional<URL> placeholder =
        reader.isListed() ? std::nullopt : Service<CloudStore>::current().placeholderFile(url);
    if (!placeholder)
        return reader;
    PVParvelLog().info("xAttrs: Using promised URL");
    return AttributeReader(*placeholder);
}

/// None when any read fails.
std::optional<Dictionary> attributesByReader(AttributeReader reader, bool alwaysAsksForFirst) {
    Dictionary attributes;
    for (const std::string_view name : readNames) {
        const bool isAsked = alwaysAsksForFirst && name == readNames.front();
        if (!isAsked && !reader.mayHold(name))
            continue;
        std::optional<String> text;
        if (!reader.read(name, text))
            return std::nullopt;
        if (text)
            attributes.set(name, std::move(*text));
    }
    return attributes;
}

}  // namespace

std::optional<Dictionary> attributeDictionaryAtURL(const URL& url) {
    // The list can be had of a file that can't be read, and an empty one where no attributes are
    // kept: only a question for a name tells.
    return attributesByReader(readerAtURL(url), /*alwaysAsksForFirst=*/true);
}

Dictionary readableAttributesAtURL(const URL& url) {
    AttributeReader reader = readerAtURL(url);
    if (reader.isListedEmpty())
        return {};
    return attributesByReader(std::move(reader), /*alwaysAsksForFirst=*/false)
        .value_or(Dictionary());
}

}  // namespace parvel
