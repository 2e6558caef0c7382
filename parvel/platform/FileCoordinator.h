#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/PVExport.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// What a coordinated write is for.
enum class WritingIntent { ForMoving = 2, ForReplacing = 8 };

/// Coordinates writers of one item, in this process and others. A caller of the file manager can
/// give it another.
class PV_EXPORT FileCoordinator {
public:
    /// Called once with the URL to use: the one asked for, the place to which the holder that it
    /// waited for moved the item, or none when its folder is gone.
    using Accessor = std::function<void(const std::optional<URL>& url)>;

    virtual ~FileCoordinator() = default;

    /// Waits until nobody else holds the item, then calls the accessor on this thread. False, with
    /// an error of makeServiceError and without the call, when the item can't be held. A write
    /// within the accessor to an item that this thread holds does not wait for itself.
    virtual bool coordinateWriting(const URL& url, WritingIntent intent, ErrorOut error,
                                   const Accessor& accessor) = 0;
    /// Tells, from within an accessor, that the item that it holds was moved: whoever waits for it
    /// meanwhile is handed the new place. Whoever comes later is handed the place that it asks for.
    virtual void itemDidMove(const URL& from, const URL& to) = 0;

    /// A new default coordinator. A killed holder leaves no lock behind.
    static std::shared_ptr<FileCoordinator> makeDefault();
};

/// Passes every operation on to another coordinator; derive from it to change some of them.
class PV_EXPORT ForwardingFileCoordinator : public FileCoordinator {
public:
    explicit ForwardingFileCoordinator(std::shared_ptr<FileCoordinator> target)
        : m_target(std::move(target)) {}

    bool coordinateWriting(const URL& url, WritingIntent intent, ErrorOut error,
                           const Accessor& accessor) override {
        return m_target->coordinateWriting(url, intent, error, accessor);
    }
    void itemDidMove(const URL& from, const URL& to) override { m_target->itemDidMove(from, to); }

private:
    std::shared_ptr<FileCoordinator> m_target;
};

}  // namespace parvel
