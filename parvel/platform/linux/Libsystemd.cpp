#include "parvel/platform/linux/Libsystemd.h"

namespace parvel::host {

const Libsystemd& Libsystemd::host() {
    return loadedOnce<Libsystemd>(PARVEL_SONAME);
}

}  // namespace parvel::host
