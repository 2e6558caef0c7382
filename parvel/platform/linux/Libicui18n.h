#pragma once

#include <unicode/udat.h>

#include "parvel/platform/linux/LoadedLibrary.h"

namespace parvel::host {

/// ICU's date formats, whose names hold ICU's version.
class Libicui18n : public LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const Libicui18n& host();

    PARVEL_LOADED_FUNCTION(udat_open);
    PARVEL_LOADED_FUNCTION(udat_close);
    PARVEL_LOADED_FUNCTION(udat_format);
    PARVEL_LOADED_FUNCTION(udat_parse);
};

}  // namespace parvel::host
