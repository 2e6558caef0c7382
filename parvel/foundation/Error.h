#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>

#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// The library's own domain; its codes are PVParvelFoundationErrorCode. Where a header names a code
/// below zero alone (-1002), it is one of these.
inline constexpr std::string_view PVParvelFoundationErrorDomain = "PVParvelFoundationErrorDomain";
/// The platform's general file errors; the codes are PVFileErrorCode. A header's "general error
/// 259" is one of these.
inline constexpr std::string_view PVFileErrorDomain = "PVFileErrorDomain";
/// The code is an errno value (POSIX.1).
inline constexpr std::string_view PVPOSIXErrorDomain = "PVPOSIXErrorDomain";

/// User info: a list of underlying errors. Reserved for clients; the library never fills it.
inline constexpr std::string_view PVParvelFoundationUnderlyingErrorsKey =
    "PVParvelFoundationUnderlyingErrorsKey";
/// User info: the URL that the error concerns.
inline constexpr std::string_view PVURLErrorKey = "PVURLErrorKey";
/// User info: the failure reason, as text for a person.
inline constexpr std::string_view PVLocalizedFailureReasonErrorKey =
    "PVLocalizedFailureReasonErrorKey";

/// Codes of PVParvelFoundationErrorDomain. -1004, -1005 and -1007 are never raised and stay free.
enum class PVParvelFoundationErrorCode : std::int64_t {
    NoAssetType = -1001,  ///< the file name's extension is none of the four kinds'
    MissingURL = -1002,   ///< the operation needs a URL that is absent
    NoAssetID = -1003,    ///< what was read has no asset ID, or is no audio file
    NoIdentity = -1006,   ///< store ID, generated ID and path are absent, or the one of them needed
    Cancelled = -1008,    ///< a copy was cancelled
    CorruptAsset = -1009,  ///< no record, or one without URL, for synchronised storage
};

/// Codes of PVFileErrorDomain.
enum class PVFileErrorCode : std::int64_t {
    NoSuchFile = 4,    ///< a file or a folder on the way to it does not exist
    Corrupt = 259,     ///< a file's content could not be read for what it should be
    FileExists = 516,  ///< something stands at the place already
};

/// What went wrong: a domain, a code in that domain, and user info.
class PV_EXPORT Error {
public:
    using Info = std::variant<URL, std::string>;
    using UserInfo = std::map<std::string, Info, std::less<>>;

    Error(std::string_view domain, std::int64_t code, UserInfo userInfo = {})
        : m_domain(domain), m_code(code), m_userInfo(std::move(userInfo)) {}

    [[nodiscard]] const std::string& domain() const { return m_domain; }
    [[nodiscard]] std::int64_t code() const { return m_code; }
    [[nodiscard]] const UserInfo& userInfo() const { return m_userInfo; }
    /// The URL under PVURLErrorKey, null when there is none.
    [[nodiscard]] const URL* url() const;
    /// The failure reason, else fixed English for the codes of this header, else the C locale's
    /// text for a POSIX code.
    [[nodiscard]] std::string message() const;

    friend bool operator==(const Error&, const Error&) = default;

private:
    std::string m_domain;
    std::int64_t m_code;
    UserInfo m_userInfo;
};

/// Inspection: the URL's extension is none of the four kinds'.
PV_EXPORT Error makeNoAssetTypeError(const URL& url);
/// A URL that the operation needs is absent. No user info.
PV_EXPORT Error makeMissingURLError();
/// A reader's record has an empty asset ID; an audiobook could not be opened as one.
PV_EXPORT Error makeNoAssetIDError(const URL& url);
/// Store ID, generated ID and path are all absent where an identity is needed; a dictionary has no
/// usable "path"; attributes are to be updated or set for a record without asset ID. No user info.
PV_EXPORT Error makeNoIdentityError();
/// A copy found itself cancelled; the URL, where there is one, is the source's.
PV_EXPORT Error makeCancelledError(const std::optional<URL>& source);
/// An asset without record or URL was to go into or out of synchronised storage.
PV_EXPORT Error makeCorruptAssetError(std::string reason);

/// A general file error, with the URL where one is given.
PV_EXPORT Error makeFileError(PVFileErrorCode code, const std::optional<URL>& url);
/// A POSIX error with the URL where one is given.
PV_EXPORT Error makePOSIXError(int errnoValue, const std::optional<URL>& url);
/// How the file-system, coordination, resource-query and whole-file services report an errno:
/// ENOENT and ENOTDIR as no such file, EEXIST and ENOTEMPTY as file exists, EBADMSG as corrupt (all
/// general file errors), anything else as a POSIX error; always with the URL.
PV_EXPORT Error makeServiceError(int errnoValue, const URL& url);

}  // namespace parvel
