#include "parvel/platform/linux/Libcrypto.h"

namespace parvel::host {

const Libcrypto& Libcrypto::host() {
    return loadedOnce<Libcrypto>(PARVEL_SONAME);
}

}  // namespace parvel::host
