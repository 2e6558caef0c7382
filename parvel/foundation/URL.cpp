#include "parvel/foundation/URL.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <functional>
#include <system_error>
#include <utility>

namespace parvel {
namespace {

constexpr std::string_view kFilePrefix = "file://";
constexpr std::string_view kReplacementCharacter = "\xEF\xBF\xBD";

bool isLetter(char character) {
    return (character >= 'A' && character <= 'Z') || (character >= 'a' && character <= 'z');
}

bool isDigit(char character) {
    return character >= '0' && character <= '9';
}

bool isSpaceOrControl(char character) {
    return static_cast<unsigned char>(character) <= ' ' || character == '\x7F';
}

/// The bytes that stand for themselves in the text made from a path.
constexpr std::array<bool, 256> kPlainInPath = [] {
    std::array<bool, 256> plain{};
    for (char character : std::string_view("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
                                           "0123456789-._~!$&'()*+,;=:@/"))
        plain[static_cast<unsigned char>(character)] = true;
    return plain;
}();

void appendEncoded(std::string& text, std::string_view path) {
    constexpr std::string_view kHexDigits = "0123456789ABCDEF";
    const auto isPlain = [](char c) { return kPlainInPath[static_cast<unsigned char>(c)]; };
    for (auto next = path.begin(); next != path.end(); ++next) {
        const auto special = std::find_if_not(next, path.end(), isPlain);
        text.append(next, special);
        if (special == path.end())
            return;
        const auto byte = static_cast<unsigned char>(*special);
        text += '%';
        text += kHexDigits[byte >> 4];
        text += kHexDigits[byte & 15];
        next = special;
    }
}

std::optional<unsigned> hexDigitValue(char character) {
    if (isDigit(character))
        return character - '0';
    if (character >= 'A' && character <= 'F')
        return character - 'A' + 10;
    if (character >= 'a' && character <= 'f')
        return character - 'a' + 10;
    return std::nullopt;
}

/// None for a broken escape and for a NUL.
std::optional<std::string> percentDecoded(std::string_view text) {
    std::string decoded;
    decoded.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            decoded += text[i];
            continue;
        }
        if (text.size() - i < 3)
            return std::nullopt;
        const std::optional<unsigned> high = hexDigitValue(text[i + 1]);
        const std::optional<unsigned> low = hexDigitValue(text[i + 2]);
        if (!high || !low || *high + *low == 0)
            return std::nullopt;
        decoded += static_cast<char>(*high << 4 | *low);
        i += 2;
    }
    return decoded;
}

bool equalsIgnoringCase(std::string_view text, std::string_view lowerCase) {
    return std::equal(text.begin(), text.end(), lowerCase.begin(), lowerCase.end(),
                      [](char left, char right) {
                          return (left >= 'A' && left <= 'Z' ? left + ('a' - 'A') : left) == right;
                      });
}

/// Where the components of absolute URL text lie (RFC 3986).
struct URLParts {
    std::string_view scheme;
    std::optional<std::string_view> authority;
    std::string_view path;
};

/// None where there is no scheme.
std::optional<URLParts> splitURL(std::string_view text) {
    const std::size_t colon = text.find(':');
    if (colon == std::string_view::npos || colon == 0)
        return std::nullopt;
    URLParts parts{text.substr(0, colon), std::nullopt, text.substr(colon + 1)};
    const bool isScheme = isLetter(parts.scheme.front()) &&
                          std::all_of(parts.scheme.begin(), parts.scheme.end(), [](char c) {
                              return isLetter(c) || isDigit(c) || c == '+' || c == '-' || c == '.';
                          });
    if (!isScheme)
        return std::nullopt;

    if (parts.path.starts_with("//")) {
        parts.path.remove_prefix(2);
        const std::size_t end = std::min(parts.path.find_first_of("/?#"), parts.path.size());
        parts.authority = parts.path.substr(0, end);
        parts.path.remove_prefix(end);
    }
    parts.path = parts.path.substr(0, parts.path.find_first_of("?#"));
    return parts;
}

/// The text of a URL with another path in the old one's place.
std::string replacingPath(const std::string& text, std::string_view path) {
    const std::string_view old = splitURL(text).value_or(URLParts{}).path;
    return std::string(text).replace(static_cast<std::size_t>(old.data() - text.data()), old.size(),
                                     path);
}

/// All but a first slash.
std::string_view withoutTrailingSlashes(std::string_view path) {
    while (path.size() > 1 && path.ends_with('/'))
        path.remove_suffix(1);
    return path;
}

/// The absolute path without `.`, `..` and repeated slashes.
std::string standardizedPath(std::string_view path) {
    std::string result;
    result.reserve(path.size());
    while (!path.empty()) {
        const std::size_t slash = std::min(path.find('/'), path.size());
        const std::string_view component = path.substr(0, slash);
        path.remove_prefix(std::min(slash + 1, path.size()));
        if (component == "..")
            result.erase(std::min(result.rfind('/'), result.size()));
        else if (!component.empty() && component != ".")
            result.append("/").append(component);
    }
    return result.empty() ? "/" : result;
}

}  // namespace

URL URL::fileURLWithPath(std::string_view path) {
    path = withoutTrailingSlashes(path);
    std::string bytes;
    bytes.reserve(path.size());
    for (std::size_t nul = path.find('\0'); nul != std::string_view::npos; nul = path.find('\0')) {
        bytes.append(path.substr(0, nul)).append(kReplacementCharacter);
        path.remove_prefix(nul + 1);
    }
    bytes.append(path);

    std::string text;
    text.reserve(kFilePrefix.size() + bytes.size());
    text.append(kFilePrefix);
    appendEncoded(text, bytes);
    return {std::move(text), std::move(bytes), /*isFile=*/true};
}

std::optional<URL> URL::fromString(std::string_view text) {
    if (std::any_of(text.begin(), text.end(), isSpaceOrControl))
        return std::nullopt;
    const std::optional<URLParts> parts = splitURL(text);
    if (!parts)
        return std::nullopt;
    if (!equalsIgnoringCase(parts->scheme, "file"))
        return URL(std::string(text), std::string(parts->path), /*isFile=*/false);

    const std::string_view host = parts->authority.value_or("");
    if (!host.empty() && !equalsIgnoringCase(host, "localhost"))
        return std::nullopt;
    std::optional<std::string> path = percentDecoded(parts->path);
    if (!path || path->empty())
        return std::nullopt;
    path->resize(withoutTrailingSlashes(*path).size());
    return URL(std::string(text), std::move(*path), /*isFile=*/true);
}

std::string_view URL::lastPathComponent() const {
    return lastComponentOfPath(path());
}

std::string_view URL::pathExtension() const {
    return extensionOfPath(path());
}

URL URL::deletingLastPathComponent() const {
    const std::string_view parent = pathWithoutLastComponent(path());
    if (isFileURL())
        return fileURLWithPath(parent);
    return {replacingPath(absoluteString(), parent), std::string(parent), /*isFile=*/false};
}

URL URL::appendingPathComponent(std::string_view component) const {
    if (isFileURL())
        return fileURLWithPath(pathAppending(path(), component));
    std::string encoded;
    appendEncoded(encoded, component);
    std::string appended = pathAppending(path().empty() ? "/" : path(), encoded);
    std::string text = replacingPath(absoluteString(), appended);
    return {std::move(text), std::move(appended), /*isFile=*/false};
}

URL URL::standardized() const {
    const bool isAbsolute = path().starts_with('/');
    const bool isStandard = isAbsolute && path().find("//") == std::string::npos &&
                            path().find("/.") == std::string::npos;
    if (!isFileURL() || isStandard)
        return *this;
    if (isAbsolute)
        return fileURLWithPath(standardizedPath(path()));
    std::error_code ignored;  // without a current directory the path starts at the root
    const std::string directory = std::filesystem::current_path(ignored).string();
    return fileURLWithPath(standardizedPath(pathAppending(directory, path())));
}

std::size_t URL::hash() const {
    return std::hash<std::string>{}(isFileURL() ? path() : absoluteString());
}

bool operator==(const URL& left, const URL& right) {
    if (left.isFileURL() != right.isFileURL())
        return false;
    return left.isFileURL() ? left.path() == right.path()
                            : left.absoluteString() == right.absoluteString();
}

std::string_view lastComponentOfPath(std::string_view path) {
    path = withoutTrailingSlashes(path);
    const std::size_t slash = path.rfind('/');
    return slash == std::string_view::npos || path.size() == 1 ? path : path.substr(slash + 1);
}

std::string_view extensionOfPath(std::string_view path) {
    path = withoutTrailingSlashes(path);
    const std::size_t dot = path.find_last_of("./");
    return dot == std::string_view::npos || path[dot] == '/' ? std::string_view()
                                                             : path.substr(dot + 1);
}

std::string_view pathWithoutExtension(std::string_view path) {
    path = withoutTrailingSlashes(path);
    const std::string_view extension = extensionOfPath(path);
    return extension.empty() ? path : path.substr(0, path.size() - extension.size() - 1);
}

std::string_view pathWithoutLastComponent(std::string_view path) {
    path = withoutTrailingSlashes(path);
    const std::size_t slash = path.rfind('/');
    if (slash == std::string_view::npos)
        return {};
    return withoutTrailingSlashes(path.substr(0, slash + 1));
}

std::string pathAppending(std::string_view path, std::string_view component) {
    if (path.empty() || component.empty())
        return std::string(path.empty() ? component : path);
    path = path.substr(0, path.find_last_not_of('/') + 1);
    component.remove_prefix(std::min(component.find_first_not_of('/'), component.size()));
    return std::string(path).append("/").append(component);
}

}  // namespace parvel
