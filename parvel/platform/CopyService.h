#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

namespace parvel {

enum class CopyOperation { Data = 4, Attributes = 5 };
enum class CopyStage { Start = 1, Finish = 2, Error = 3, Progress = 4 };
enum class CopyAnswer { Continue = 0, Quit = 2 };

/// One report of a running copy.
struct CopyReport {
    CopyOperation operation;
    CopyStage stage;
    std::optional<std::uint64_t> bytesCopied;  ///< none where it can't be told
};

/// Copies a single item with progress.
class CopyService {
public:
    /// Called on the copying thread; its answer says whether the copy goes on.
    using StatusCallback = std::function<CopyAnswer(const CopyReport& report)>;

    virtual ~CopyService() = default;

    /// Copies data and extended attributes, no permissions, owner or times, to a name where nothing
    /// stands; of a folder, the folder alone. The source's link is followed. 0, with the copy
    /// written through to the disk, or -1 with errno set: EEXIST where anything has the name,
    /// ECANCELED for a quit, EIO for a file that grew or shrank meanwhile, EOPNOTSUPP for what is
    /// neither file nor folder. What was made stays. The callback, if any, hears of data (start,
    /// progress after each piece of at most 1 MiB, or 16 MiB where the file system shares them,
    /// finish), then of attributes, and of an error in either, which ends the copy whatever it
    /// answers.
    [[nodiscard]] virtual int copy(const std::string& source, const std::string& destination,
                                   const StatusCallback& callback) = 0;

    static CopyService& host();
};

}  // namespace parvel
