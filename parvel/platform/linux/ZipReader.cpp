#include <cerrno>
#include <optional>

#include "parvel/platform/ZipArchive.h"
#include "parvel/platform/linux/LibzipArchive.h"
#include "parvel/platform/linux/OpenItem.h"
#include "parvel/platform/linux/PlainZip.h"

namespace parvel {

namespace {

/// An archive that is read as a plain one as long as that gives sure answers, and by libzip from
/// then on.
class HostZipArchive final : public ZipArchive {
public:
    explicit HostZipArchive(std::shared_ptr<const host::OpenItem> file) : m_file(std::move(file)) {}

    /// False when neither way makes it an archive.
    [[nodiscard]] bool open() {
        m_plain = host::PlainZip::open(m_file->descriptor.get(), size());
        return m_plain || openFully();
    }

    std::optional<Data> readEntry(std::string_view name, std::uint64_t limit) override {
        if (name.empty() || name.ends_with('/') || name.find('\0') != std::string_view::npos)
            return std::nullopt;
        std::optional<Data> content;
        if (m_plain && m_plain->readEntry(name, limit, content) == host::PlainZip::Answer::Sure)
            return content;
        if (!m_full && !openFully())
            return std::nullopt;
        return m_full->readEntry(name, limit);
    }

private:
    bool openFully() {
        m_plain.reset();
        m_full = host::LibzipArchive::open(m_file->descriptor.get(), size());
        return m_full != nullptr;
    }

    [[nodiscard]] std::uint64_t size() const {
        return static_cast<std::uint64_t>(m_file->status.st_size);
    }

    std::shared_ptr<const host::OpenItem> m_file;
    std::unique_ptr<host::PlainZip> m_plain;
    std::unique_ptr<host::LibzipArchive> m_full;
};

class HostZipReader final : public ZipReader {
public:
    std::unique_ptr<ZipArchive> open(const URL& url, ErrorOut error) override {
        if (!url.isFileURL())
            return fail(error, makeServiceError(ENOENT, url));
        auto file = host::heldOrOpened(url.path());
        if (!file)
            return fail(error, makeServiceError(errno, url));
        if (S_ISDIR(file->status.st_mode))
            return fail(error, makeServiceError(EISDIR, url));
        if (!S_ISREG(file->status.st_mode))
            return fail(error, makeServiceError(EBADMSG, url));

        auto archive = std::make_unique<HostZipArchive>(std::move(file));
        if (!archive->open())
            return fail(error, makeServiceError(EBADMSG, url));
        return archive;
    }
};

}  // namespace

ZipReader& ZipReader::host() {
    static HostZipReader reader;
    return reader;
}

}  // namespace parvel
