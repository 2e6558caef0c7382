#pragma once

#include <sys/socket.h>

namespace parvel::host {

/// Whether nobody but this user, or the system's own, listens where a connection to that address of
/// the loopback interface ends. False where it can't be told.
[[nodiscard]] bool isListenerTrusted(const sockaddr_storage& address);

}  // namespace parvel::host
