#include "parvel/xattr/AttributeDictionary.h"

#include <algorithm>
#include <array>
#include <string>
#include <vector>

#include "parvel/foundation/PVParvelLog.h"
#include "parvel/platform/CloudStore.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XattrStore.h"
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

/// Which attributes stand on a file, so that those which do not need not be asked for one by one.
class StandingNames {
public:
    explicit StandingNames(const URL& url) : m_store(Service<XattrStore>::current()) {
        m_isKnown = url.isFileURL() && m_store.list(url.path(), m_names) == 0;
    }

    /// Whether asking for the attribute could give anything but its absence.
    [[nodiscard]] bool mayHold(std::string_view name) const {
        if (!m_isKnown)
            return true;
        const std::optional<std::string> decorated = m_store.decorated(std::string(name));
        return !decorated || std::find(m_names.begin(), m_names.end(), *decorated) != m_names.end();
    }

private:
    XattrStore& m_store;
    std::vector<std::string> m_names;
    bool m_isKnown;
};

}  // namespace

std::optional<Dictionary> attributeDictionaryAtURL(const URL& url) {
    const std::optional<URL> placeholder = Service<CloudStore>::current().placeholderFile(url);
    if (placeholder)
        PVParvelLog().info("xAttrs: Using promised URL");
    const URL& carrier = placeholder ? *placeholder : url;

    const StandingNames standing(carrier);
    // The first name is asked for in any case: the list can be had of a file that can't be read.
    Dictionary attributes;
    for (const std::string_view name : readNames) {
        if (name != readNames.front() && !standing.mayHold(name))
            continue;
        std::optional<String> text;
        if (!pvamfm_extendedAttributeString_forKey_error(carrier, &text, name))
            return std::nullopt;
        if (text)
            attributes.set(name, std::move(*text));
    }
    return attributes;
}

}  // namespace parvel
