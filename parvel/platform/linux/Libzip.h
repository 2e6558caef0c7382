#pragma once

#include <zip.h>

#include "parvel/platform/linux/LoadedLibrary.h"

namespace parvel::host {

/// libzip, as far as archives are read by it.
class Libzip : public LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const Libzip& host();

    PARVEL_LOADED_FUNCTION(zip_open_from_source);
    PARVEL_LOADED_FUNCTION(zip_discard);
    PARVEL_LOADED_FUNCTION(zip_get_num_entries);
    PARVEL_LOADED_FUNCTION(zip_get_name);
    PARVEL_LOADED_FUNCTION(zip_stat_init);
    PARVEL_LOADED_FUNCTION(zip_stat_index);
    PARVEL_LOADED_FUNCTION(zip_file_get_external_attributes);
    PARVEL_LOADED_FUNCTION(zip_fopen_index);
    PARVEL_LOADED_FUNCTION(zip_fread);
    PARVEL_LOADED_FUNCTION(zip_fclose);
    PARVEL_LOADED_FUNCTION(zip_source_function_create);
    PARVEL_LOADED_FUNCTION(zip_source_free);
    PARVEL_LOADED_FUNCTION(zip_source_make_command_bitmap);
    PARVEL_LOADED_FUNCTION(zip_source_seek_compute_offset);
    PARVEL_LOADED_FUNCTION(zip_error_set);
    PARVEL_LOADED_FUNCTION(zip_error_to_data);
};

}  // namespace parvel::host
