#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/Command.h"
#include "cli/Interrupt.h"
#include "cli/Progress.h"
#include "cli/TransferAdvice.h"
#include "cli/ZipWriter.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/StagingDirectory.h"

namespace parvel::cli {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view kMimetype = "mimetype";
constexpr std::string_view kContainer = "META-INF/container.xml";
constexpr std::size_t kLongestMimetype = 1024;

/// An open file, closed with its owner.
class OpenFile {
public:
    OpenFile(const std::string& path, int flags)
        : m_descriptor(open(path.c_str(), flags | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0666)) {}
    ~OpenFile() {
        if (m_descriptor >= 0)
            close(m_descriptor);
    }
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;

    [[nodiscard]] int get() const { return m_descriptor; }
    /// 0 for a regular file, else why it can't be packed.
    [[nodiscard]] int error() const {
        struct stat status {};
        if (m_descriptor < 0 || fstat(m_descriptor, &status) != 0)
            return errno;
        return S_ISREG(status.st_mode) ? 0 : EOPNOTSUPP;
    }

private:
    int m_descriptor;
};

/// What could not be packed, and why.
struct Failure {
    int errnoValue = 0;
    std::string path;
};

/// The package's files by their paths below it, in the order of the paths' bytes, `mimetype` aside.
std::vector<std::string> membersOf(const fs::path& package, Failure& failure) {
    std::vector<std::string> members;
    std::error_code error;
    fs::recursive_directory_iterator entries(package, error);
    for (; !error && entries != fs::recursive_directory_iterator(); entries.increment(error)) {
        // Left behind by a killed run, and no part of the book.
        const bool isStaged =
            entries->path().filename().string().starts_with(StagingDirectory::namePrefix);
        if (isStaged)
            entries.disable_recursion_pending();
        else if (!entries->is_directory(error) || entries->is_symlink(error))
            members.push_back(entries->path().lexically_relative(package).string());
    }
    if (error)
        failure = {error.value(), package.string()};
    std::erase(members, kMimetype);
    std::sort(members.begin(), members.end());
    return members;
}

/// What says that the archive is a book: as the package has it, else as every EPUB book does.
std::string mimetypeOf(const fs::path& package, Failure& failure) {
    const OpenFile file((package / kMimetype).string(), O_RDONLY);
    if (file.get() < 0 && errno == ENOENT)
        return "application/epub+zip";
    std::string text(kLongestMimetype, '\0');
    const int error = file.error();
    const ssize_t count = error == 0 ? read(file.get(), text.data(), text.size()) : -1;
    if (count < 0)
        failure = {error != 0 ? error : errno, (package / kMimetype).string()};
    text.resize(count < 0 ? 0 : static_cast<std::size_t>(count));
    while (text.ends_with('\n') || text.ends_with('\r'))
        text.pop_back();
    return text;
}

/// Where the archive's file system keeps no attributes, they stay behind.
int copyAttributes(const std::string& from, int to) {
    std::string names(65536, '\0');
    const ssize_t length = listxattr(from.c_str(), names.data(), names.size());
    if (length < 0)
        return errno == ENOTSUP ? 0 : errno;
    std::string value(65536, '\0');
    for (const char* name = names.c_str(); name < names.c_str() + length;
         name += std::strlen(name) + 1) {
        if (!std::string_view(name).starts_with("user."))
            continue;
        const ssize_t size = getxattr(from.c_str(), name, value.data(), value.size());
        if (size < 0)
            return errno;
        if (fsetxattr(to, name, value.data(), static_cast<std::size_t>(size), 0) != 0)
            return errno == ENOTSUP ? 0 : errno;
    }
    return 0;
}

/// What the members take, as far as that can be seen before they are read.
std::uint64_t sizeOf(const fs::path& package, const std::vector<std::string>& members) {
    std::uint64_t size = 0;
    for (const std::string& member : members) {
        std::error_code unknown;
        const std::uint64_t bytes = fs::file_size(package / member, unknown);
        size += unknown ? 0 : bytes;
    }
    return size;
}

/// Writes the archive of the package into an empty file.
Failure writeArchive(const fs::path& package, int file, Progress& progress) {
    Failure failure;
    const std::string mimetype = mimetypeOf(package, failure);
    const std::vector<std::string> members = membersOf(package, failure);
    if (failure.errnoValue != 0)
        return failure;
    ZipWriter archive(file);
    if (const int error = archive.addStored(kMimetype, mimetype))
        return {error, package.string()};
    const auto size = static_cast<double>(sizeOf(package, members));
    const auto goOn = [&](std::uint64_t bytesRead) {
        progress.report(std::min(static_cast<double>(bytesRead) / size, 1.0));
        return !interrupted();
    };
    for (const std::string& member : members) {
        const std::string path = (package / member).string();
        const OpenFile source(path, O_RDONLY);
        int error = interrupted() ? ECANCELED : source.error();
        if (error == 0)
            error = archive.addDeflated(member, source.get(), goOn);
        if (error != 0)
            return {error, path};
    }
    int error = archive.finish();
    if (error == 0)
        error = copyAttributes(package.string(), file);
    if (error == 0 && fsync(file) != 0)
        error = errno;
    return {error, package.string()};
}

class PackCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void pack(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;
    [[nodiscard]] bool isRefused(PVAssetMetadataFileManager& manager, const URL& package,
                                 Result& result) const;
    [[nodiscard]] Failure writeStaged(const URL& package, const URL& staged,
                                      const Result& result) const;

    std::optional<std::string> m_file;
    std::optional<URL> m_target;
    ProgressOption m_progress;
    AssetChanges m_changes;

    Progress::Form m_form = Progress::Form::Auto;
};

void PackCommand::declare(CommandLine& line) {
    line.group("Where to");
    line.option("-o,--output", "FILE", "the zipped book to make; nothing may stand there", m_file);
    m_progress.declare(line);
    m_changes.declare(line);
}

int PackCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    m_form = m_progress.form();
    if (!m_file)
        throw UsageError("say where to: -o FILE");
    if (!m_changes.hasOnePath(operands))
        throw UsageError("one PATH is packed into FILE");
    m_target = urlOfPath(*m_file);
    if (!PVAssetMetadata::isBookURL(*m_target))
        throw UsageError("-o " + *m_file + ": a book ends in .epub or .folium");
    return m_changes.run("pack", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { pack(manager, asset, result); });
}

/// The result says why.
bool PackCommand::isRefused(PVAssetMetadataFileManager& manager, const URL& package,
                            Result& result) const {
    std::error_code unknown;
    if (!standsAt(package)) {
        result.error = makeFileError(PVFileErrorCode::NoSuchFile, package);
        return true;
    }
    if (!fs::is_directory(package.path(), unknown)) {
        refuse(result, "it is no package folder", "a zipped book is packed already");
        return true;
    }
    if (!fs::exists(fs::path(package.path()) / kContainer, unknown)) {
        refuse(result, "it holds no book", "a book has a " + std::string(kContainer));
        return true;
    }
    if (liesWithin(m_target->standardized().deletingLastPathComponent(), package)) {
        refuse(result, "the zipped book would be a part of itself", "choose a FILE elsewhere");
        return true;
    }
    if (manager.fileManager()->itemExistsAtPath(m_target->path())) {
        result.error = makeFileError(PVFileErrorCode::FileExists, *m_target);
        result.advice = "something stands at " + m_target->path() + ": choose another FILE";
        return true;
    }
    return false;
}

/// A rehearsal writes into a file without a name.
Failure PackCommand::writeStaged(const URL& package, const URL& staged,
                                 const Result& result) const {
    std::error_code unknown;
    const bool isRehearsal = m_changes.isDryRun();
    const fs::path temporary = fs::canonical(fs::temp_directory_path(unknown), unknown);
    const OpenFile file(isRehearsal ? temporary.string() : staged.path(),
                        O_RDWR | (isRehearsal ? O_TMPFILE : O_CREAT | O_EXCL));
    if (file.get() < 0)
        return {errno, staged.path()};
    Progress progress(m_form, result.path);
    return writeArchive(package.path(), file.get(), progress);
}

void PackCommand::pack(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                       Result& result) const {
    const URL package = *asset->url();
    result.nothing = "not packed";
    if (isRefused(manager, package, result))
        return;
    const URL folder = m_target->standardized().deletingLastPathComponent();
    const auto staging = StagingDirectory::makeIn(folder, &result.error);
    if (!staging) {
        result.advice = "there must be a folder " + folder.path() + " that can be written to";
        return;
    }

    const URL staged = staging->url().appendingPathComponent(m_target->lastPathComponent());
    const Failure failure = writeStaged(package, staged, result);
    if (failure.errnoValue == ECANCELED) {
        result.error = makeCancelledError(package);
        return;
    }
    if (failure.errnoValue != 0) {
        result.error = makePOSIXError(failure.errnoValue, URL::fileURLWithPath(failure.path));
        const bool isFull = failure.errnoValue == ENOSPC || failure.errnoValue == EDQUOT;
        if (!isFull)
            result.advice = failure.path + " can't be packed";
        return;
    }
    const bool isMoved =
        m_changes.isDryRun() || manager.fileManager()->moveItem(staged, *m_target, &result.error);
    if (!isMoved)
        return;
    setRecord(result, asset->copyWithUpdatedURL(*m_target), PVAssetMetadataFlavorFull);
    result.outcome = "packed as " + m_target->path();
}

}  // namespace

std::unique_ptr<Command> makePackCommand() {
    return std::make_unique<PackCommand>();
}

}  // namespace parvel::cli
