#pragma once

#include <cstdint>
#include <memory>
#include <optional>

#include "parvel/foundation/Image.h"
#include "parvel/platform/linux/HelperProcess.h"

namespace parvel::host {

/// A helper for one call of one thread: the one that waits idle, where its means suffice, else a
/// new one. Afterwards it waits for the next call, unless one waits already or it has served its
/// time.
class HelperLease {
public:
    explicit HelperLease(const HelperMeans& wanted = {});
    ~HelperLease();
    HelperLease(const HelperLease&) = delete;
    HelperLease& operator=(const HelperLease&) = delete;

    /// The helper; null when none can be had.
    [[nodiscard]] HelperProcess* helper() const { return m_helper.get(); }
    /// Asks the helper something that needs no document to be open. A helper that had ended before
    /// is replaced. False when there is no answer, and then no helper any longer.
    [[nodiscard]] bool ask(const reader::Request& request, int descriptor, HelperAnswer& answer);
    /// Ends the helper and takes a new one.
    void replace(const HelperMeans& wanted);
    /// Ends the helper.
    void end() { m_helper.reset(); }

private:
    std::unique_ptr<HelperProcess> m_helper;
};

/// Has the helper that waits, if any, close a document that nobody needs any longer.
void letIdleHelperClose();
/// Ends the helper that waits, if any.
void endIdleHelper();

/// The bytes of a memory file that came with an answer, for as long as they are used. Null when it
/// is not one of that size that is sealed against any change.
[[nodiscard]] std::shared_ptr<const std::uint8_t[]> sealedBytes(const FileDescriptor& file,
                                                                std::uint64_t size);
/// The image that came with an answer. None when the answer does not add up.
[[nodiscard]] std::optional<Image> imageOf(const HelperAnswer& answer);

}  // namespace parvel::host
