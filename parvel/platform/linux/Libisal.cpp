#include "parvel/platform/linux/Libisal.h"

namespace parvel::host {

const Libisal& Libisal::host() {
    return loadedOnce<Libisal>(PARVEL_SONAME);
}

}  // namespace parvel::host
