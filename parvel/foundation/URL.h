#pragma once

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// A URL, nearly always a file URL (RFC 8089). It keeps the text that it was made from. A file
/// URL's path is bytes and need not be valid UTF-8. No operation asks the disk.
class PV_EXPORT URL {
public:
    URL(const URL&) = default;
    URL& operator=(const URL&) = default;
    // A move is a copy, which costs as little and leaves nobody without a text.
    // NOLINTNEXTLINE(performance-move-constructor-init)
    URL(URL&& other) noexcept : URL(std::as_const(other)) {}
    URL& operator=(URL&& other) noexcept { return *this = std::as_const(other); }
    ~URL() = default;

    /// The URL of a path as it stands; a trailing slash is dropped. A NUL, which no path can hold,
    /// becomes U+FFFD. A relative path stays relative.
    static URL fileURLWithPath(std::string_view path);
    /// Parses absolute URL text. None where it is empty, holds white space or a control character,
    /// has no scheme, or is a file URL whose path is empty, has a NUL or a broken percent escape,
    /// or whose host is neither empty nor "localhost".
    static std::optional<URL> fromString(std::string_view text);

    /// The text that the URL was made from; for one made from a path, "file://" and the path with
    /// all but `A-Z a-z 0-9 - . _ ~ ! $ & ' ( ) * + , ; = : @ /` percent-encoded.
    [[nodiscard]] const std::string& absoluteString() const { return m_parts->text; }
    [[nodiscard]] bool isFileURL() const { return m_parts->isFile; }
    /// A file URL's decoded path; another URL's path component as it stands.
    [[nodiscard]] const std::string& path() const { return m_parts->path; }

    /// The last component of the path; "/" for the root.
    [[nodiscard]] std::string_view lastPathComponent() const;
    /// The text after the last dot of the last component, also where the name begins with that dot;
    /// empty where there is none.
    [[nodiscard]] std::string_view pathExtension() const;

    /// The root stays the root.
    [[nodiscard]] URL deletingLastPathComponent() const;
    /// Appends with exactly one slash between. Only a URL that is no file's keeps its query.
    [[nodiscard]] URL appendingPathComponent(std::string_view component) const;
    /// Makes the path absolute and removes `.`, `..` and repeated slashes from its text; `..` above
    /// the root is dropped. Symbolic links are not followed. A relative path starts at the current
    /// directory; a URL that is no file's stays as it is.
    [[nodiscard]] URL standardized() const;

    [[nodiscard]] std::size_t hash() const;
    /// File URLs are equal when their paths are; others when their texts are.
    PV_EXPORT friend bool operator==(const URL& left, const URL& right);

private:
    struct Parts {
        std::string text;
        std::string path;
        bool isFile;
    };

    URL(std::string text, std::string path, bool isFile)
        : m_parts(std::make_shared<const Parts>(Parts{std::move(text), std::move(path), isFile})) {}

    std::shared_ptr<const Parts> m_parts;  ///< shared by all copies, never null
};

/// The same rules over the text of a path or file name.
PV_EXPORT std::string_view lastComponentOfPath(std::string_view path);
PV_EXPORT std::string_view extensionOfPath(std::string_view path);
/// The path without its last extension and the dot before it; one that has none stays as it is.
PV_EXPORT std::string_view pathWithoutExtension(std::string_view path);
/// The path without its last component; empty for a single component, the root for the root.
PV_EXPORT std::string_view pathWithoutLastComponent(std::string_view path);
/// The two joined with exactly one slash; the one alone where the other is empty.
PV_EXPORT std::string pathAppending(std::string_view path, std::string_view component);

}  // namespace parvel
