#pragma once

#include <systemd/sd-bus.h>
#include <systemd/sd-journal.h>

#include "parvel/platform/linux/LoadedLibrary.h"

namespace parvel::host {

/// libsystemd's journal, and as much of its D-Bus as asks and reads answers.
class Libsystemd : public LoadedLibrary {
public:
    using LoadedLibrary::LoadedLibrary;
    static const Libsystemd& host();

    // What the header's macro sd_journal_sendv calls.
    PARVEL_LOADED_FUNCTION(sd_journal_sendv_with_location);

    PARVEL_LOADED_FUNCTION(sd_bus_service_name_is_valid);
    PARVEL_LOADED_FUNCTION(sd_bus_object_path_is_valid);
    PARVEL_LOADED_FUNCTION(sd_bus_new);
    PARVEL_LOADED_FUNCTION(sd_bus_set_address);
    PARVEL_LOADED_FUNCTION(sd_bus_set_bus_client);
    PARVEL_LOADED_FUNCTION(sd_bus_start);
    PARVEL_LOADED_FUNCTION(sd_bus_is_ready);
    PARVEL_LOADED_FUNCTION(sd_bus_process);
    PARVEL_LOADED_FUNCTION(sd_bus_wait);
    PARVEL_LOADED_FUNCTION(sd_bus_call);
    PARVEL_LOADED_FUNCTION(sd_bus_close_unref);
    PARVEL_LOADED_FUNCTION(sd_bus_message_new_method_call);
    PARVEL_LOADED_FUNCTION(sd_bus_message_set_auto_start);
    PARVEL_LOADED_FUNCTION(sd_bus_message_peek_type);
    PARVEL_LOADED_FUNCTION(sd_bus_message_read);
    PARVEL_LOADED_FUNCTION(sd_bus_message_read_basic);
    PARVEL_LOADED_FUNCTION(sd_bus_message_skip);
    PARVEL_LOADED_FUNCTION(sd_bus_message_enter_container);
    PARVEL_LOADED_FUNCTION(sd_bus_message_exit_container);
    PARVEL_LOADED_FUNCTION(sd_bus_message_unref);
};

}  // namespace parvel::host
