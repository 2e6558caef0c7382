#include "parvel/foundation/PVDigest.h"

#include <memory>

#include "parvel/foundation/UpperCaseHex.h"
#include "parvel/platform/Digest.h"
#include "parvel/platform/Service.h"

namespace parvel {

std::optional<String> parvel_MD5String(const Data& data) {
    const std::unique_ptr<Digest::Running> running = Service<Digest>::current().beginMD5();
    if (!running)
        return std::nullopt;
    for (Data::Bytes range : data.ranges())
        running->update(range);
    const std::optional<Digest::MD5> digest = running->finish();
    return digest ? std::optional(upperCaseHex(*digest)) : std::nullopt;
}

}  // namespace parvel
