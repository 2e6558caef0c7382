#include "parvel/platform/linux/OpenItem.h"

#include <fcntl.h>

#include <utility>

#include "parvel/platform/HeldItem.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

thread_local const HeldItem* innermost = nullptr;

std::shared_ptr<const host::OpenItem> openAnew(const std::string& path) {
    auto item = std::make_shared<host::OpenItem>();
    item->descriptor = host::FileDescriptor(host::retried(
        [&] { return ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY); }));
    if (!item->descriptor || ::fstat(item->descriptor.get(), &item->status) != 0)
        return nullptr;
    return item;
}

}  // namespace

HeldItem::HeldItem(const URL& url)
    : m_url(url),
      m_item(url.isFileURL() ? host::heldOrOpened(url.path()) : nullptr),
      m_outer(std::exchange(innermost, this)) {}

HeldItem::~HeldItem() {
    innermost = m_outer;
}

const std::shared_ptr<const host::OpenItem>& HeldItem::at(const std::string& path) {
    static const std::shared_ptr<const host::OpenItem> nothing;
    for (const HeldItem* scope = innermost; scope; scope = scope->m_outer) {
        if (scope->m_url.path() == path)
            return scope->m_item;
    }
    return nothing;
}

std::shared_ptr<const host::OpenItem> host::heldOrOpened(const std::string& path) {
    const auto& held = HeldItem::at(path);
    return held ? held : openAnew(path);
}

}  // namespace parvel
