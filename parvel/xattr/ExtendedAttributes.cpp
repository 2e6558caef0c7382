#include "parvel/xattr/ExtendedAttributes.h"

#include <cerrno>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include "parvel/platform/Service.h"
#include "parvel/platform/XattrStore.h"
#include "parvel/xattr/AttributeText.h"

namespace parvel {

namespace {

/// A URL that is no file's has no path, and the host answers that with ENOENT.
std::string fileSystemPath(const URL& url) {
    return url.isFileURL() ? url.path() : std::string();
}

}  // namespace

bool pvamfm_setExtendedAttributeData_forKey_error(const URL& url, const Data* data,
                                                  std::string_view key, ErrorOut error) {
    XattrStore& store = Service<XattrStore>::current();

    // Deliberate: the plain name here, the decorated one everywhere else, and no exception for an
    // attribute that does not exist.
    if (!data) {
        const int errnoValue = store.remove(fileSystemPath(url), std::string(key));
        return errnoValue == 0 || fail(error, makePOSIXError(errnoValue, url));
    }

    std::string name(key);
    if (!store.decorate(name))
        return fail(error, makePOSIXError(errno, url));

    std::vector<std::uint8_t> storage;
    const int errnoValue =
        store.set(fileSystemPath(url), name, std::as_bytes(data->contiguous(storage)));
    return errnoValue == 0 || fail(error, makePOSIXError(errnoValue, url));
}

bool pvamfm_setExtendedAttributeString_forKey_error(const URL& url,
                                                    const std::optional<String>& string,
                                                    std::string_view key, ErrorOut error) {
    if (!string)
        return pvamfm_setExtendedAttributeData_forKey_error(url, nullptr, key, error);
    const Data bytes = Data::copyOf(*string);
    return pvamfm_setExtendedAttributeData_forKey_error(url, &bytes, key, error);
}

bool pvamfm_extendedAttributeData_forKey_error(const URL& url, std::optional<Data>* data,
                                               std::string_view key, ErrorOut error) {
    XattrStore& store = Service<XattrStore>::current();
    std::string name(key);
    if (!store.decorate(name))
        return fail(error, makePOSIXError(errno, url));

    const std::string path = fileSystemPath(url);
    std::size_t size = 0;
    int errnoValue = store.size(path, name, size);
    if (errnoValue == ENODATA)
        return true;
    // Deliberate: the one error without the URL.
    if (errnoValue != 0)
        return fail(error, makePOSIXError(errnoValue, std::nullopt));
    if (size == 0) {
        if (data)
            data->emplace();
        return true;
    }

    auto buffer = std::make_unique<std::uint8_t[]>(size);
    std::size_t length = 0;
    errnoValue =
        store.get(path, name, std::as_writable_bytes(std::span(buffer.get(), size)), length);
    if (errnoValue == ENODATA)
        return true;
    if (errnoValue != 0)
        return fail(error, makePOSIXError(errnoValue, url));
    // Deliberate: without a place for it a value reads as failed.
    if (!data)
        return false;
    // Deliberate: a value that has become shorter keeps the size that was asked for, zero-filled.
    *data = Data::adopt(std::move(buffer), size);
    return true;
}

bool pvamfm_extendedAttributeString_forKey_error(const URL& url, std::optional<String>* string,
                                                 std::string_view key, ErrorOut error) {
    std::optional<Data> data;
    const bool isRead = pvamfm_extendedAttributeData_forKey_error(url, &data, key, error);
    if (!isRead || !string || !data)
        return isRead;

    std::vector<std::uint8_t> storage;
    *string = attributeText(data->text(storage));
    return true;
}

}  // namespace parvel
