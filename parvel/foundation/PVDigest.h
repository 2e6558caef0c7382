#pragma once

#include <optional>

#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/Value.h"

namespace parvel {

/// The MD5 (RFC 1321) of the bytes as exactly 32 upper-case hexadecimal characters, each range fed
/// in order by one update. None where the host's digest service refuses MD5.
PV_EXPORT std::optional<String> parvel_MD5String(const Data& data);

}  // namespace parvel
