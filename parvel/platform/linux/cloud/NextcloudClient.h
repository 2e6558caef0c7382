#pragma once

#include "parvel/platform/linux/cloud/SyncClient.h"

namespace parvel::host {

/// Nextcloud's desktop client, asked over the socket that it opens for file managers, in
/// `$XDG_RUNTIME_DIR`: lines of text, of which unknown ones are passed over.
class NextcloudClient final : public SyncClient {
public:
    [[nodiscard]] std::string_view name() const override { return "Nextcloud"; }
    [[nodiscard]] ClientAnswer ask(const SyncedItem& item, Deadline deadline) override;
    [[nodiscard]] bool fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                             Deadline deadline) override;
};

/// What the client appends to the name of a file that it has not downloaded.
inline constexpr std::string_view nextcloudPlaceholderSuffix = ".nextcloud";

}  // namespace parvel::host
