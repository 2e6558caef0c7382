#pragma once

#include <optional>
#include <string_view>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"
#include "parvel/foundation/Value.h"

/// One named extended attribute of the file or folder that a URL points at; links are followed.
/// Values are raw bytes or UTF-8 text, with no type tag and no terminating NUL. Errors are POSIX
/// errors with exactly the errno value, and with the URL, but for the one that says otherwise.
/// Nothing is logged. A failed write leaves what the file system left.
namespace parvel {

/// Writes the attribute (an empty buffer makes an empty attribute), or removes it when the bytes
/// are absent. Removing one that does not exist is a failure with ENODATA. Deliberate.
PV_EXPORT bool pvamfm_setExtendedAttributeData_forKey_error(const URL& url, const Data* data,
                                                            std::string_view key,
                                                            ErrorOut error = nullptr);
/// The same with the text's UTF-8 bytes.
PV_EXPORT bool pvamfm_setExtendedAttributeString_forKey_error(const URL& url,
                                                              const std::optional<String>& string,
                                                              std::string_view key,
                                                              ErrorOut error = nullptr);

/// True with the value; true with `data` untouched when there is no such attribute. A failed size
/// query gives its error without the URL; and without `data` a present, non-empty attribute reads
/// as failed, with no error. Both deliberate.
PV_EXPORT bool pvamfm_extendedAttributeData_forKey_error(const URL& url, std::optional<Data>* data,
                                                         std::string_view key,
                                                         ErrorOut error = nullptr);
/// The same as text, which ends at the first NUL. Bytes that are no valid UTF-8, also where that is
/// behind the NUL, give no text: `string` becomes none. Without `string` the attribute is read all
/// the same.
PV_EXPORT bool pvamfm_extendedAttributeString_forKey_error(const URL& url,
                                                           std::optional<String>* string,
                                                           std::string_view key,
                                                           ErrorOut error = nullptr);

}  // namespace parvel
