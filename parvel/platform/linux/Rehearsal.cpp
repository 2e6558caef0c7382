#include "parvel/platform/Rehearsal.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <string>

#include "parvel/platform/CloudStore.h"
#include "parvel/platform/DirectoryEnumerator.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XattrStore.h"
#include "parvel/platform/linux/Paths.h"
#include "parvel/platform/linux/RehearsedContent.h"
#include "parvel/platform/linux/RehearsedDisk.h"

namespace parvel {

namespace {

using host::RehearsedDisk;

/// The longest value that the kernel takes (XATTR_SIZE_MAX).
constexpr std::size_t kLongestValue = 65536;

/// Waits for nobody, since nothing is written.
class RehearsedCoordinator : public FileCoordinator {
public:
    explicit RehearsedCoordinator(std::shared_ptr<RehearsedDisk> disk) : m_disk(std::move(disk)) {}

    bool coordinateWriting(const URL& url, WritingIntent /*intent*/, ErrorOut /*error*/,
                           const Accessor& accessor) override {
        const bool hasPlace = m_disk->itemStandsAt(url.path()) ||
                              m_disk->itemStandsAt(host::parentFolderOf(url.path()));
        accessor(hasPlace ? std::optional(url) : std::nullopt);
        return true;
    }
    void itemDidMove(const URL& /*from*/, const URL& /*to*/) override {}

private:
    std::shared_ptr<RehearsedDisk> m_disk;
};

/// Reads through to the store in force before; keeps what is written to itself.
class RehearsedAttributes : public XattrStore {
public:
    explicit RehearsedAttributes(std::shared_ptr<RehearsedDisk> disk)
        : m_disk(std::move(disk)), m_store(Service<XattrStore>::current()) {}

    bool decorate(std::string& name) override { return m_store.decorate(name); }

    int size(const std::string& path, const std::string& name, std::size_t& size) override {
        const auto attributes = m_disk->attributesAt(path);
        const auto found = attributes.find(name);
        if (found == attributes.end())
            return m_store.size(placeOf(path), name, size);
        size = found->second ? found->second->size() : 0;
        return found->second ? 0 : ENODATA;
    }

    int get(const std::string& path, const std::string& name, std::span<std::byte> buffer,
            std::size_t& length) override {
        const auto attributes = m_disk->attributesAt(path);
        const auto found = attributes.find(name);
        if (found == attributes.end())
            return m_store.get(placeOf(path), name, buffer, length);
        if (!found->second)
            return ENODATA;
        if (found->second->size() > buffer.size())
            return ERANGE;
        length = found->second->size();
        std::copy(found->second->begin(), found->second->end(), buffer.begin());
        return 0;
    }

    int set(const std::string& path, const std::string& name,
            std::span<const std::byte> value) override {
        if (const int error = writeError(path, name))
            return error;
        if (value.size() > kLongestValue)
            return E2BIG;
        m_disk->setAttribute(path, name, std::vector<std::byte>(value.begin(), value.end()));
        return 0;
    }

    int remove(const std::string& path, const std::string& name) override {
        std::size_t ignored = 0;
        int error = writeError(path, name);
        if (error == 0)
            error = size(path, name, ignored);
        if (error == 0)
            m_disk->setAttribute(path, name, std::nullopt);
        return error;
    }

    int list(const std::string& path, std::vector<std::string>& names) override {
        const int error = m_store.list(placeOf(path), names);
        if (error != 0)
            return error;
        for (const auto& [name, value] : m_disk->attributesAt(path)) {
            const auto listed = std::find(names.begin(), names.end(), name);
            if (value && listed == names.end())
                names.push_back(name);
            else if (!value && listed != names.end())
                names.erase(listed);
        }
        return 0;
    }

private:
    /// Nothing stands at the empty path.
    [[nodiscard]] std::string placeOf(const std::string& path) const {
        return m_disk->realPath(path).value_or(std::string());
    }

    /// What writing would fail with: the attribute can't be read, the item is no file or folder, or
    /// its permissions forbid it.
    int writeError(const std::string& path, const std::string& name) {
        const std::string place = placeOf(path);
        std::size_t ignored = 0;
        struct stat status {};
        if (::stat(place.c_str(), &status) != 0)
            return errno;
        if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
            return EPERM;
        if (::faccessat(AT_FDCWD, place.c_str(), W_OK, AT_EACCESS) != 0)
            return errno;
        const int error = m_store.size(place, name, ignored);
        return error == ENODATA || error == EACCES ? 0 : error;
    }

    std::shared_ptr<RehearsedDisk> m_disk;
    XattrStore& m_store;
};

/// Finds what lies in a folder and lets its modes be.
class RehearsedEnumerator : public DirectoryEnumerator {
public:
    explicit RehearsedEnumerator(std::shared_ptr<RehearsedDisk> disk)
        : m_disk(std::move(disk)), m_enumerator(Service<DirectoryEnumerator>::current()) {}

    void enumerate(const URL& directory, const std::function<void(const Entry&)>& visit) override {
        const auto place = m_disk->realPath(directory.path());
        if (!place)
            return;
        m_enumerator.enumerate(URL::fileURLWithPath(*place),
                               [&visit](const Entry& entry) { visit(UnchangedEntry(entry)); });
    }

private:
    class UnchangedEntry : public Entry {
    public:
        explicit UnchangedEntry(const Entry& entry) : m_entry(entry) {}
        [[nodiscard]] std::optional<bool> isDirectory() const override {
            return m_entry.isDirectory();
        }
        [[nodiscard]] std::optional<std::uint64_t> totalAllocatedSize() const override {
            return m_entry.totalAllocatedSize();
        }
        bool setPermissions(unsigned /*mode*/) const override { return true; }

    private:
        const Entry& m_entry;
    };

    std::shared_ptr<RehearsedDisk> m_disk;
    DirectoryEnumerator& m_enumerator;
};

/// Has nothing downloaded, and takes it that it would not come.
class RehearsedCloudStore : public CloudStore {
public:
    std::optional<bool> isUbiquitous(const URL& url, ErrorOut error) override {
        return m_store.isUbiquitous(url, error);
    }
    bool isPromisedItemReachable(const URL& url, ErrorOut error) override {
        return m_store.isPromisedItemReachable(url, error);
    }
    bool downloadingStatus(const URL& url, std::optional<DownloadingStatus>& status,
                           ErrorOut error) override {
        return m_store.downloadingStatus(url, status, error);
    }
    std::optional<URL> placeholderFile(const URL& url) override {
        return m_store.placeholderFile(url);
    }
    bool lieBelowOneRoot(const URL& left, const URL& right) override {
        return m_store.lieBelowOneRoot(left, right);
    }
    bool renamesWhole(const URL& item) override { return m_store.renamesWhole(item); }
    bool isAllHere(const URL& url) override { return m_store.isAllHere(url); }
    bool fetchContent(const URL& url, ErrorOut error) override {
        return m_store.isAllHere(url) || fail(error, makePOSIXError(ETIMEDOUT, url));
    }
    std::optional<CloudReport> report(const URL& url, ErrorOut error) override {
        return m_store.report(url, error);
    }

private:
    CloudStore& m_store = Service<CloudStore>::current();
};

}  // namespace

struct Rehearsal::Services {
    std::shared_ptr<RehearsedDisk> disk = std::make_shared<RehearsedDisk>();
    std::shared_ptr<FileSystemService> fileManager = host::makeFileSystemService(disk);
    std::shared_ptr<FileCoordinator> fileCoordinator = std::make_shared<RehearsedCoordinator>(disk);
    RehearsedAttributes attributes{disk};
    RehearsedEnumerator enumerator{disk};
    host::RehearsedContent content{disk};
    RehearsedCloudStore cloud;
    Service<XattrStore>::Replacement attributesInForce{attributes};
    Service<DirectoryEnumerator>::Replacement enumeratorInForce{enumerator};
    Service<CloudStore>::Replacement cloudInForce{cloud};
};

Rehearsal::Rehearsal() : m_services(std::make_unique<Services>()) {}

Rehearsal::~Rehearsal() = default;

std::shared_ptr<FileSystemService> Rehearsal::fileManager() const {
    return m_services->fileManager;
}

std::shared_ptr<FileCoordinator> Rehearsal::fileCoordinator() const {
    return m_services->fileCoordinator;
}

}  // namespace parvel
