#pragma once

#include <isa-l/igzip_lib.h>

#include "parvel/platform/linux/LoadedLibrary.h"

namespace parvel::host {

/// libisal, as far as images are compressed by it.
class Libisal : public LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const Libisal& host();

    PARVEL_LOADED_FUNCTION(isal_deflate_init);
    PARVEL_LOADED_FUNCTION(isal_deflate);
};

}  // namespace parvel::host
