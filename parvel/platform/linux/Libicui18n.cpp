#include "parvel/platform/linux/Libicui18n.h"

namespace parvel::host {

const Libicui18n& Libicui18n::host() {
    return loadedOnce<Libicui18n>(PARVEL_SONAME);
}

}  // namespace parvel::host
