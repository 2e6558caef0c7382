#pragma once

#include <openssl/evp.h>

#include "parvel/platform/linux/LoadedLibrary.h"

namespace parvel::host {

/// OpenSSL's digests.
class Libcrypto : public LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const Libcrypto& host();

    PARVEL_LOADED_FUNCTION(EVP_MD_fetch);
    PARVEL_LOADED_FUNCTION(EVP_sha256);
    PARVEL_LOADED_FUNCTION(EVP_MD_CTX_new);
    PARVEL_LOADED_FUNCTION(EVP_MD_CTX_free);
    PARVEL_LOADED_FUNCTION(EVP_DigestInit_ex);
    PARVEL_LOADED_FUNCTION(EVP_DigestUpdate);
    PARVEL_LOADED_FUNCTION(EVP_DigestFinal_ex);
};

}  // namespace parvel::host
