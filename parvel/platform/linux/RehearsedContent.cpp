#include "parvel/platform/linux/RehearsedContent.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <filesystem>
#include <mutex>
#include <utility>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/CopyService.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/FileWriter.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/StagingDirectory.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/StagingFolder.h"

namespace parvel::host {

namespace {

/// The service that is in force before a rehearsal puts its own there.
template <class Interface>
class Rehearsed : public Interface {
public:
    explicit Rehearsed(std::shared_ptr<RehearsedDisk> disk)
        : m_disk(std::move(disk)), m_service(Service<Interface>::current()) {}

protected:
    std::shared_ptr<RehearsedDisk> m_disk;
    Interface& m_service;
};

/// Passes an error on, if there is one, as one about the URL that was asked for.
void passOn(const std::optional<Error>& failure, const URL& url, ErrorOut error) {
    if (failure)
        assign(error, Error(failure->domain(), failure->code(),
                            Error::UserInfo{{std::string(PVURLErrorKey), url}}));
}

class RehearsedReader final : public Rehearsed<FileReader> {
public:
    using Rehearsed::Rehearsed;

    std::optional<Data> readFile(const URL& url, std::uint64_t limit, ErrorOut error) override {
        const auto place = m_disk->realPath(url.path());
        if (!place)
            return fail(error, makeServiceError(ENOENT, url));
        std::optional<Error> failure;
        auto data = m_service.readFile(URL::fileURLWithPath(*place), limit, &failure);
        passOn(failure, url, error);
        return data;
    }

    std::optional<Data> readMember(const URL& package, std::string_view path, std::uint64_t limit,
                                   ErrorOut error) override {
        const URL member = package.appendingPathComponent(path);
        const auto place = placeOf(package, path);
        if (!place)
            return fail(error, makeServiceError(ENOENT, member));
        std::optional<Error> failure;
        auto data = m_service.readMember(URL::fileURLWithPath(place->first), place->second, limit,
                                         &failure);
        passOn(failure, member, error);
        return data;
    }

private:
    /// The folder and the path below it at which a member really lies. Only one directly in the
    /// package may have been moved or replaced.
    [[nodiscard]] std::optional<std::pair<std::string, std::string>> placeOf(
        const URL& package, std::string_view path) const {
        if (path.find('/') == std::string_view::npos && path != "." && path != "..") {
            const auto place = m_disk->realPath(package.appendingPathComponent(path).path());
            if (!place)
                return std::nullopt;
            return std::pair(parentFolderOf(*place), std::string(lastComponentOfPath(*place)));
        }
        const auto place = m_disk->realPath(package.path());
        return place ? std::optional(std::pair(*place, std::string(path))) : std::nullopt;
    }
};

class RehearsedWriter final : public Rehearsed<FileWriter> {
public:
    using Rehearsed::Rehearsed;

    bool writeFile(const URL& url, const Data&, ErrorOut error) override {
        const int failure = m_disk->makeFile(url.path());
        return failure == 0 || fail(error, makeServiceError(failure, url));
    }
};

class RehearsedQueries final : public Rehearsed<ResourceQueries> {
public:
    using Rehearsed::Rehearsed;

    bool isReachable(const URL& url, ErrorOut error) override {
        if (m_disk->madeAt(url.path()))
            return true;
        const auto place = realURL(url, error);
        std::optional<Error> failure;
        const bool reachable = place && m_service.isReachable(*place, &failure);
        passOn(failure, url, error);
        return reachable;
    }

    std::optional<bool> isDirectory(const URL& url, ErrorOut error) override {
        if (const auto made = m_disk->madeAt(url.path()))
            return *made == RehearsedDisk::Made::Folder;
        const auto place = realURL(url, error);
        std::optional<Error> failure;
        const auto directory = place ? m_service.isDirectory(*place, &failure) : std::nullopt;
        passOn(failure, url, error);
        return directory;
    }

    std::optional<std::uint64_t> totalAllocatedSize(const URL& url, ErrorOut error) override {
        if (m_disk->madeAt(url.path()))
            return 0;
        const auto place = realURL(url, error);
        std::optional<Error> failure;
        const auto size = place ? m_service.totalAllocatedSize(*place, &failure) : std::nullopt;
        passOn(failure, url, error);
        return size;
    }

    std::optional<DirectoryRelationship> relationship(const URL& directory, const URL& item,
                                                      ErrorOut error) override {
        return m_service.relationship(directory, item, error);
    }

private:
    [[nodiscard]] std::optional<URL> realURL(const URL& url, ErrorOut error) const {
        const auto place = m_disk->realPath(url.path());
        if (!place)
            return fail(error, makeServiceError(ENOENT, url));
        return URL::fileURLWithPath(*place);
    }
};

/// Takes the copy's name; the copy is read where its source lies.
class RehearsedCopies final : public Rehearsed<CopyService> {
public:
    using Rehearsed::Rehearsed;

    int copy(const std::string& source, const std::string& destination,
             const StatusCallback& callback) override {
        const int error = copied(source, destination, callback);
        if (error == 0)
            return 0;
        errno = error;
        return -1;
    }

private:
    int copied(const std::string& source, const std::string& destination,
               const StatusCallback& callback) {
        const auto place = m_disk->realPath(source);
        if (!place)
            return ENOENT;
        const FileDescriptor from(
            ::open(place->c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
        struct stat status {};
        if (!from || ::fstat(from.get(), &status) != 0)
            return errno;
        if (S_ISDIR(status.st_mode))
            return m_disk->makeFolder(destination);
        if (!S_ISREG(status.st_mode))
            return EOPNOTSUPP;
        if (const int error = m_disk->makeFrom(*place, destination))
            return error;
        for (const CopyStage stage : {CopyStage::Start, CopyStage::Finish}) {
            if (callback && callback({CopyOperation::Data, stage, 0}) == CopyAnswer::Quit)
                return ECANCELED;
        }
        return 0;
    }
};

/// Where packages are really made.
class Scratch {
public:
    /// A path of no item yet; empty, with the errno value, where there can be none.
    std::string nextPath(int& error) {
        const std::lock_guard lock(m_mutex);
        if (!m_folder) {
            std::error_code failure;
            const auto temporary = std::filesystem::temp_directory_path(failure);
            error = failure.value();
            if (!failure)
                makeIn(temporary.string(), error);
        }
        return m_folder ? pathAppending(m_folder->path(), std::to_string(++m_count))
                        : std::string();
    }

private:
    void makeIn(const std::string& temporary, int& error) {
        if (auto made = StagingFolder::makeIn(temporary, error))
            m_folder.emplace(std::move(*made));
    }

    std::mutex m_mutex;
    std::optional<StagingFolder> m_folder;
    std::size_t m_count = 0;
};

class RehearsedCopier final : public ArchiveCopier {
public:
    RehearsedCopier(std::shared_ptr<RehearsedDisk> disk, std::shared_ptr<Scratch> scratch,
                    std::shared_ptr<ArchiveCopier> copier)
        : m_disk(std::move(disk)), m_scratch(std::move(scratch)), m_copier(std::move(copier)) {}

    void setCallbacks(ArchiveCopierCallbacks* callbacks) override {
        m_callbacks = callbacks;
        m_copier->setCallbacks(callbacks);
    }
    Count countTree(const std::string& path) override {
        return m_copier->countTree(m_disk->realPath(path).value_or(path));
    }
    Count countArchive(const std::string& path) override {
        return m_copier->countArchive(m_disk->realPath(path).value_or(path));
    }

    int copy(const std::string& source, const std::string& destination,
             const Dictionary& options) override {
        const auto place = m_disk->realPath(source);
        int error = place ? m_disk->makingError(destination) : ENOENT;
        const std::string made = error == 0 ? m_scratch->nextPath(error) : std::string();
        if (made.empty())
            return fatal(error);
        if ((error = m_copier->copy(*place, made, options)) != 0)
            return error;
        error = m_disk->makeFrom(made, destination);
        return error == 0 ? 0 : fatal(error);
    }

    void cancel() override { m_copier->cancel(); }

private:
    int fatal(int error) {
        if (m_callbacks) {
            errno = error;
            m_callbacks->fatalError(*this);
        }
        return error;
    }

    std::shared_ptr<RehearsedDisk> m_disk;
    std::shared_ptr<Scratch> m_scratch;
    std::shared_ptr<ArchiveCopier> m_copier;
    ArchiveCopierCallbacks* m_callbacks = nullptr;
};

class RehearsedCopiers final : public Rehearsed<ArchiveCopierFactory> {
public:
    using Rehearsed::Rehearsed;

    std::shared_ptr<ArchiveCopier> makeCopier() override {
        return std::make_shared<RehearsedCopier>(m_disk, m_scratch, m_service.makeCopier());
    }

private:
    std::shared_ptr<Scratch> m_scratch = std::make_shared<Scratch>();
};

class RehearsedStaging final : public Rehearsed<StagingService> {
public:
    using Rehearsed::Rehearsed;

    std::unique_ptr<StagingDirectory> makeIn(const URL& folder, ErrorOut error) override {
        const URL url = folder.appendingPathComponent(randomName(StagingDirectory::namePrefix));
        const int failure = m_disk->makeFolder(url.path());
        if (failure != 0)
            return fail(error, makeServiceError(failure, folder));
        return std::make_unique<Folder>(m_disk, url);
    }

private:
    class Folder final : public StagingDirectory {
    public:
        Folder(std::shared_ptr<RehearsedDisk> disk, URL url)
            : m_disk(std::move(disk)), m_url(std::move(url)) {}
        ~Folder() override { (void)m_disk->remove(m_url.path()); }
        Folder(const Folder&) = delete;
        Folder& operator=(const Folder&) = delete;
        [[nodiscard]] const URL& url() const override { return m_url; }

    private:
        std::shared_ptr<RehearsedDisk> m_disk;
        URL m_url;
    };
};

}  // namespace

struct RehearsedContent::Services {
    explicit Services(const std::shared_ptr<RehearsedDisk>& disk)
        : reader(disk), writer(disk), queries(disk), copies(disk), copiers(disk), staging(disk) {}

    RehearsedReader reader;
    RehearsedWriter writer;
    RehearsedQueries queries;
    RehearsedCopies copies;
    RehearsedCopiers copiers;
    RehearsedStaging staging;
    Service<FileReader>::Replacement readerInForce{reader};
    Service<FileWriter>::Replacement writerInForce{writer};
    Service<ResourceQueries>::Replacement queriesInForce{queries};
    Service<CopyService>::Replacement copiesInForce{copies};
    Service<ArchiveCopierFactory>::Replacement copiersInForce{copiers};
    Service<StagingService>::Replacement stagingInForce{staging};
};

RehearsedContent::RehearsedContent(std::shared_ptr<RehearsedDisk> disk)
    : m_services(std::make_unique<Services>(disk)) {}

RehearsedContent::~RehearsedContent() = default;

}  // namespace parvel::host
