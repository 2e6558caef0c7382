#include "parvel/platform/PropertyList.h"

#include <vector>

#include "parvel/foundation/Error.h"
#include "parvel/platform/linux/PropertyListForms.h"

namespace parvel {
namespace {

constexpr std::string_view kBinarySignature = "bplist00";

class PropertyLists final : public PropertyListCodec {
public:
    std::optional<Value> parse(const Data& bytes, const std::optional<URL>& url,
                               ErrorOut error) override {
        std::vector<std::uint8_t> storage;
        const bool isBinary = bytes.text(storage).starts_with(kBinarySignature);
        std::optional<Value> value = isBinary ? readBinaryPropertyList(bytes.contiguous(storage))
                                              : readXMLPropertyList(bytes);
        if (!value)
            return fail(error, makeFileError(PVFileErrorCode::Corrupt, url));
        return value;
    }

    std::optional<Data> writeXML(const Value& value) override {
        return writeXMLPropertyList(value);
    }
};

}  // namespace

PropertyListCodec& PropertyListCodec::host() {
    static PropertyLists codec;
    return codec;
}

}  // namespace parvel
