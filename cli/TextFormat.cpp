#include <array>
#include <charconv>
#include <filesystem>

#include "cli/ResultFormat.h"
#include "cli/TerminalText.h"
#include "parvel/foundation/ValueReadings.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/xattr/ExtendedAttributes.h"
#include "parvel/xattr/PNMetadataXattr.h"

namespace parvel::cli {
namespace {

constexpr std::size_t kLabelWidth = 14;

using Describe = std::string (*)(const Value& value);

std::string asText(const Value& value) {
    return stringForm(&value).value_or(description(value));
}

/// "2001-01-01", with the time of day where it has one.
std::string asDate(const Value& value) {
    const Date* date = value.as<Date>();
    std::string text = date ? isoText(*date) : std::string();
    if (text.empty())
        return asText(value);
    text = text.substr(0, text.find_first_of(".Z"));
    if (text.ends_with("T00:00:00"))
        return text.substr(0, text.size() - 9);
    text[text.find('T')] = ' ';
    return text + " UTC";
}

/// "1.2 MB", in powers of 1000.
std::string asSize(std::uint64_t bytes) {
    static constexpr std::array units{"bytes", "kB", "MB", "GB", "TB", "PB", "EB"};
    double amount = static_cast<double>(bytes);
    std::size_t unit = 0;
    while (amount >= 999.95 && unit + 1 < units.size()) {
        amount /= 1000;
        ++unit;
    }
    std::array<char, 32> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), amount,
                                   std::chars_format::fixed, unit == 0 ? 0 : 1);
    return std::string(digits.data(), end.ptr) + " " + units[unit];
}

std::string asSizeOf(const Value& value) {
    if (const Data* data = value.as<Data>())
        return asSize(data->size());
    return asSize(unsignedReading(&value));
}

std::string asShare(const Value& value) {
    const double share = doubleReading(&value);
    if (!(share >= 0 && share <= 1))
        return asText(value);
    return std::to_string(static_cast<int>(share * 100 + 0.5)) + " %";
}

std::string asInsertionDate(const Value& value) {
    return asDate(Date{static_cast<double>(int64Reading(&value))});
}

/// An entry of the record that has a line of its own.
struct Field {
    std::string_view key;
    std::string_view label;
    Describe describe;
};

constexpr std::array kFields{
    Field{key::artistName, "Author", asText},
    Field{key::genre, "Genre", asText},
    Field{key::year, "Year", asText},
    Field{key::rating, "Rating", asText},
    Field{key::releaseDate, "Released", asDate},
    Field{key::modificationDate, "Modified", asDate},
    Field{key::pageCount, "Pages", asText},
    Field{key::versionNumber, "Version", asText},
    Field{key::producer, "Made with", asText},
    Field{key::insertionDate, "Added", asInsertionDate},
    Field{key::purchaseDate, "First opened", asDate},
    Field{key::lastOpenDate, "Last opened", asDate},
    Field{key::percentComplete, "Complete", asShare},
    Field{key::allocatedSize, "On disk", asSizeOf},
    Field{key::coverImageData, "Cover", asSizeOf},
    Field{key::comments, "Comments", asText},
    Field{key::assetDescription, "Description", asText},
};

struct Flag {
    std::string_view key;
    std::string_view words;
};

constexpr std::array kFlags{
    Flag{key::isPreview, "a preview"},
    Flag{key::isLocked, "locked with a password"},
    Flag{key::isExplicit, "explicit"},
    Flag{key::wasRedacted, "redacted"},
    Flag{key::hasPendingUpdates, "has edits that are not stored yet"},
};

struct AttributeName {
    std::string_view name;
    std::string_view words;
};

constexpr std::array kAttributes{
    AttributeName{PNMetadataXattrAssetID, "identity"},
    AttributeName{PNMetadataXattrTitle, "title"},
    AttributeName{PNMetadataXattrSortTitle, "sort title"},
    AttributeName{PNMetadataXattrAuthor, "author"},
    AttributeName{PNMetadataXattrSortAuthor, "sort author"},
    AttributeName{PNMetadataXattrGenre, "genre"},
    AttributeName{PNMetadataXattrComments, "comments"},
    AttributeName{PNMetadataXattrBookDescription, "description"},
    AttributeName{PNMetadataXattrYear, "year"},
    AttributeName{PNMetadataXattrExplicit, "explicit"},
    AttributeName{PNMetadataXattrLastOpened, "last opened"},
    AttributeName{PNMetadataXattrFirstOpened, "first opened"},
    AttributeName{PNMetadataXattrRating, "rating"},
};

std::string_view kindText(PVAssetType type) {
    switch (type) {
        case PVAssetTypeEPub:
            return "EPUB book";
        case PVAssetTypeKestrelPub:
            return "Folium book";
        case PVAssetTypePDF:
            return "PDF document";
        case PVAssetTypeAudiobook:
            return "Audiobook";
        case PVAssetTypeUnknown:
            break;
    }
    return "Unknown";
}

/// What a book, document or audiobook is known by, and where that comes from.
std::string identityText(const Result& result) {
    const Dictionary& record = *result.record;
    if (stringForm(record.find(key::storeID)))
        return *result.assetID + " (the store's)";
    const Value* info = record.find(key::bookInfo);
    const Dictionary* bookInfo = info ? info->as<Dictionary>() : nullptr;
    const Value* hash = bookInfo ? bookInfo->find(key::packageHash) : nullptr;
    const bool isHash = hash && *hash == Value(*result.assetID);
    return *result.assetID + (isHash ? " (hash of the package document)" : "");
}

/// What the library keeps on the file itself, which goes before what the file holds.
std::string attributesText(const URL& url) {
    std::string text;
    for (const AttributeName& attribute : kAttributes) {
        std::optional<String> value;
        if (pvamfm_extendedAttributeString_forKey_error(url, &value, attribute.name) && value)
            text.append(text.empty() ? "" : ", ").append(attribute.words);
    }
    return text;
}

std::string flagsText(const Dictionary& record) {
    std::string text;
    for (const Flag& flag : kFlags) {
        if (boolReading(record.find(flag.key)))
            text.append(text.empty() ? "" : ", ").append(flag.words);
    }
    return text;
}

std::string fileText(const Result& result) {
    std::error_code unknown;
    const std::uintmax_t size = std::filesystem::file_size(urlOfPath(result.path).path(), unknown);
    return unknown ? result.path : result.path + " (" + asSize(size) + ")";
}

/// A title in bold, and a line a field with the values below each other.
class TextFormat : public ResultFormat {
public:
    TextFormat() : m_terminal(Terminal::ofStandardOutput()) {}

    void append(const Result& result, std::string& out) const override;
    [[nodiscard]] std::string_view separator() const override { return "\n"; }

private:
    void appendTitle(const Result& result, std::string& out) const;
    void appendField(std::string_view label, std::string_view text, std::string& out) const;

    const Terminal m_terminal;
};

void TextFormat::appendTitle(const Result& result, std::string& out) const {
    const Value* stored = result.record->find(key::itemName);
    const std::string title = stringForm(stored).value_or(std::string());
    const std::string shown = title.empty() ? std::string(lastComponentOfPath(result.path)) : title;
    for (const std::string& line : wrapped(shown, m_terminal.width)) {
        out += m_terminal.hasStyles ? "\x1b[1m" + line + "\x1b[0m" : line;
        out.push_back('\n');
    }
}

void TextFormat::appendField(std::string_view label, std::string_view text,
                             std::string& out) const {
    cli::appendField(label, text, kLabelWidth, m_terminal.width, out);
}

void TextFormat::append(const Result& result, std::string& out) const {
    if (!result.record)
        return;
    const Dictionary& record = *result.record;
    appendTitle(result, out);
    appendField("Kind", kindText(result.assetType), out);
    if (result.assetID)
        appendField("Identity", identityText(result), out);
    for (const Field& field : kFields) {
        if (const Value* value = record.find(field.key))
            appendField(field.label, field.describe(*value), out);
    }
    appendField("Marks", flagsText(record), out);
    appendField("On the file", attributesText(urlOfPath(result.path)), out);
    // As it is, spaces too, so that it can be copied.
    out += "  File" + std::string(kLabelWidth - 4, ' ') + safeText(fileText(result)) + "\n";
}

}  // namespace

std::unique_ptr<ResultFormat> makeTextFormat() {
    return std::make_unique<TextFormat>();
}

}  // namespace parvel::cli
