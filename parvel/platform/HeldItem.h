#pragma once

#include <memory>

#include "parvel/foundation/URL.h"

namespace parvel {

namespace host {
struct OpenItem;
}

/// Holds the file or folder at a URL open while it lives: what this thread then asks the host about
/// that very path (whether it can be reached, is a folder, which attributes it has) and reads there
/// (entries of the archive, members of the folder, PDF documents, media tags) comes from the one
/// open item. So the path is looked up once, and all answers are about the same item, though
/// another should take its name meanwhile. What is written goes by the path as ever.
///
/// Where the item can't be opened, for lack of permission say, nothing is held and each service
/// looks the path up. Scopes nest: one within another of the same path holds the same item.
class HeldItem {
public:
    /// Borrows the URL. A link is followed.
    explicit HeldItem(const URL& url);
    ~HeldItem();
    HeldItem(const HeldItem&) = delete;
    HeldItem& operator=(const HeldItem&) = delete;

    /// What this thread holds at the path; null where that is nothing.
    [[nodiscard]] static const std::shared_ptr<const host::OpenItem>& at(const std::string& path);

private:
    const URL& m_url;
    std::shared_ptr<const host::OpenItem> m_item;
    const HeldItem* m_outer;
};

}  // namespace parvel
