#include "parvel/foundation/PropertyList.h"

#include "parvel/platform/MalformedInput.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/platform/Service.h"

namespace parvel {

std::optional<Value> valueFromPropertyList(const Data& bytes, const std::optional<URL>& url,
                                           ErrorOut error) {
    try {
        return Service<PropertyListCodec>::current().parse(bytes, url, error);
    } catch (const MalformedInput&) {
        return fail(error, makeFileError(PVFileErrorCode::Corrupt, url));
    }
}

std::optional<Data> xmlPropertyList(const Value& value) {
    return Service<PropertyListCodec>::current().writeXML(value);
}

}  // namespace parvel
