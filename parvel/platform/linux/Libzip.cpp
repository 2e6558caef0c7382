#include "parvel/platform/linux/Libzip.h"

namespace parvel::host {

const Libzip& Libzip::host() {
    return loadedOnce<Libzip>(PARVEL_SONAME);
}

}  // namespace parvel::host
