#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel {

class ArchiveCopier;

/// What a copier's file is.
enum class ArchiveObjectType { File, Link };

/// What a copier does after a file's error: any other answer leaves the file out and goes on.
inline constexpr int kStopAfterFileError = 2;

/// Hears of a running copy, on the copying thread. `errno` is set before an error is told.
class ArchiveCopierCallbacks {
public:
    virtual ~ArchiveCopierCallbacks() = default;

    /// The copy as a whole can't go on.
    virtual void fatalError(ArchiveCopier& copier) = 0;
    /// A file can't be copied; the path is the one that it would have had.
    [[nodiscard]] virtual int fileError(ArchiveCopier& copier, const std::string& path,
                                        int errnoValue) = 0;
    /// A file or link is whole at its path. Its size is the one that it was counted with.
    virtual void fileFinished(ArchiveCopier& copier, const std::string& path,
                              ArchiveObjectType type, std::uint64_t size) = 0;
};

/// Copies a folder's tree, or expands a zip archive into a folder, a file at a time. Nothing is
/// written outside the destination, whatever the source says. For one copy, on one thread; `cancel`
/// may come from any.
class ArchiveCopier {
public:
    /// The option, a boolean, that the source is a zip archive to expand.
    static constexpr std::string_view extractPKZip = "extractPKZip";

    struct Count {
        std::uint64_t files = 0;
        std::uint64_t bytes = 0;
        friend bool operator==(const Count&, const Count&) = default;
    };

    virtual ~ArchiveCopier() = default;

    /// The copier borrows them; null for none.
    virtual void setCallbacks(ArchiveCopierCallbacks* callbacks) = 0;

    /// Files and links at any depth, with the files' sizes; of what can't be read, nothing.
    [[nodiscard]] virtual Count countTree(const std::string& path) = 0;
    /// The entries that are no folders, with the sizes that the archive claims; of what is no
    /// archive, nothing.
    [[nodiscard]] virtual Count countArchive(const std::string& path) = 0;

    /// 0, with everything written through to the disk, or the errno value of what ended the copy:
    /// ECANCELED when cancelled. The destination must not exist (EEXIST, fatal). What was made
    /// stays after a failure.
    ///
    /// A tree keeps its modes, access lists, times, attributes and the links that stay inside it,
    /// and its owners as far as they may be given. Hidden staging items in the folder itself are no
    /// part of it: they are neither counted nor copied. Refused are other links and trees deeper
    /// than 200 folders (ELOOP), devices, pipes and sockets (EOPNOTSUPP), and a file that grows or
    /// shrinks meanwhile (EIO).
    ///
    /// An archive's files become 0600, its folders 0700; those that root makes belong to the
    /// archive's owner and group, so that a book which root expands stays its owner's. Refused are
    /// a file that is no archive, or whose entries claim more than it can hold, or more than
    /// 100,000 folders (EBADMSG), or more than the disk has room for (ENOSPC), all fatal; entries
    /// with an absolute name or an empty, `.` or `..` component (EPERM), a name too long or too
    /// deep (ENAMETOOLONG), links (ELOOP), devices and unknown methods (EOPNOTSUPP), encrypted ones
    /// (EACCES), a name's second one (EEXIST), and those whose content is not of the size and
    /// checksum that they claim (EBADMSG).
    [[nodiscard]] virtual int copy(const std::string& source, const std::string& destination,
                                   const Dictionary& options) = 0;
    /// Ends a copy, running or to come, within its current piece.
    virtual void cancel() = 0;
};

/// Makes archive copiers.
class ArchiveCopierFactory {
public:
    virtual ~ArchiveCopierFactory() = default;

    [[nodiscard]] virtual std::shared_ptr<ArchiveCopier> makeCopier() = 0;

    static ArchiveCopierFactory& host();
};

}  // namespace parvel
