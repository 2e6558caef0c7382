#pragma once

#include <memory>
#include <optional>
#include <string>

#include "parvel/foundation/Data.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// The tags of the media store's MP4 key space that are read, and the atoms that carry them.
enum class MediaTag {
    SongID,    ///< "cnID"
    Artist,    ///< "©ART"
    SongName,  ///< "©nam"
    CoverArt,  ///< "covr"
};

/// An MP4 audio file (ISO/IEC 14496-12) opened for its tags. The first item of a key decides. For
/// one thread.
class MediaAsset {
public:
    virtual ~MediaAsset() = default;

    /// The tag's value as text, integers in decimal. None when the tag is missing, or its value
    /// can't be text or is longer than 1 MiB.
    [[nodiscard]] virtual std::optional<std::string> text(MediaTag tag) = 0;
    /// The bytes as embedded, of a tag whose value is neither text nor a number. None over the
    /// limit.
    [[nodiscard]] virtual std::optional<Data> bytes(MediaTag tag, std::uint64_t limit) = 0;
};

/// Opens audio files.
class MediaTags {
public:
    virtual ~MediaTags() = default;

    /// Null for what can't be read or does not begin like an MP4 file. A file costs a few reads,
    /// whatever its length.
    [[nodiscard]] virtual std::unique_ptr<MediaAsset> open(const URL& url) = 0;

    static MediaTags& host();
};

}  // namespace parvel
