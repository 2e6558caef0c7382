#pragma once

#include "parvel/platform/linux/cloud/SyncClient.h"

namespace parvel::host {

/// Syncthing, found by its configuration and asked over its REST interface on the loopback. It
/// downloads by itself. What this device has no version of, or leaves out, is not downloaded, and a
/// package is not as long as anything below it is needed.
class SyncthingClient final : public SyncClient {
public:
    [[nodiscard]] std::string_view name() const override { return "Syncthing"; }
    [[nodiscard]] ClientAnswer ask(const SyncedItem& item, Deadline deadline) override;
    [[nodiscard]] bool fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                             Deadline deadline) override;
};

}  // namespace parvel::host
