#pragma once

#include <memory>

#include "parvel/platform/Digest.h"
#include "parvel/platform/linux/Libcrypto.h"

namespace parvel {

/// Digests that are made by the library, which is asked for with each; none where it is not
/// complete.
[[nodiscard]] std::unique_ptr<Digest> makeDigestOpenSSL(const host::Libcrypto& (*libcrypto)());

}  // namespace parvel
