#include <fcntl.h>
#include <sys/stat.h>

#include <optional>

#include "parvel/platform/ZipArchive.h"
#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/LibzipArchive.h"
#include "parvel/platform/linux/PlainZip.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

/// An archive that is read as a plain one as long as that gives sure answers, and by libzip from
/// then on.
class HostZipArchive final : public ZipArchive {
public:
    HostZipArchive(host::FileDescriptor file, std::uint64_t size)
        : m_file(std::move(file)), m_size(size) {}

    /// False when neither way makes it an archive.
    [[nodiscard]] bool open() {
        m_plain = host::PlainZip::open(m_file.get(), m_size);
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
        m_full = host::LibzipArchive::open(m_file.get(), m_size);
        return m_full != nullptr;
    }

    host::FileDescriptor m_file;
    std::uint64_t m_size;
    std::unique_ptr<host::PlainZip> m_plain;
    std::unique_ptr<host::LibzipArchive> m_full;
};

class HostZipReader final : public ZipReader {
public:
    std::unique_ptr<ZipArchive> open(const URL& url, ErrorOut error) override {
        if (!url.isFileURL())
            return fail(error, makeServiceError(ENOENT, url));
        host::FileDescriptor file(host::retried([&] {
            return ::open(url.path().c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY);
        }));
        struct stat status;
        if (!file || ::fstat(file.get(), &status) != 0)
            return fail(error, makeServiceError(errno, url));
        if (S_ISDIR(status.st_mode))
            return fail(error, makeServiceError(EISDIR, url));
        if (!S_ISREG(status.st_mode))
            return fail(error, makeServiceError(EBADMSG, url));

        auto archive = std::make_unique<HostZipArchive>(std::move(file),
                                                        static_cast<std::uint64_t>(status.st_size));
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
