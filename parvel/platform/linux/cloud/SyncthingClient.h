#pragma once

#include "parvel/platform/linux/cloud/SyncClient.h"

namespace parvel::host {

/// Syncthing, found by its configuration and asked over its REST interface on the loopback. It
/// downloads by itself, and renames what has arrived whole, so that a file under its own name is
/// all here; a package is, once nothing below it is needed any more.
class SyncthingClient final : public SyncClient {
public:
    [[nodiscard]] std::string_view name() const override { return "Syncthing"; }
    [[nodiscard]] ClientAnswer ask(const SyncedItem& item, Deadline deadline) override;
    [[nodiscard]] bool fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                             Deadline deadline) override;
};

}  // namespace parvel::host
