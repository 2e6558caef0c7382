#include "parvel/platform/PdfDocument.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <tuple>
#include <utility>

#include "parvel/platform/TextRules.h"
#include "parvel/platform/linux/HelperPool.h"
#include "parvel/platform/linux/OpenItem.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

using host::HelperAnswer;
using host::HelperLease;
using host::HelperMeans;
using host::HelperProcess;
using reader::Ask;
using reader::Outcome;
using reader::Reply;
using reader::Request;

constexpr std::size_t readPiece = 256 * 1024;
constexpr std::string_view missingHelper = "The helper program parvel-reader can't be started.";

/// What tells a file in one state from all others.
auto identityOf(const struct stat& status) {
    return std::make_tuple(status.st_dev, status.st_ino, status.st_size, status.st_mtim.tv_sec,
                           status.st_mtim.tv_nsec, status.st_ctim.tv_sec, status.st_ctim.tv_nsec);
}

struct PdfInput {
    URL url;
    std::shared_ptr<const host::OpenItem> file;

    [[nodiscard]] int descriptor() const { return file->descriptor.get(); }
    [[nodiscard]] std::uint64_t size() const {
        return static_cast<std::uint64_t>(file->status.st_size);
    }
    [[nodiscard]] HelperMeans means() const {
        HelperMeans means;
        if (size() <= reader::longestMapped)
            means.inputBytes = std::max(means.inputBytes, size());
        return means;
    }
};

class HelperPdfFile final : public PdfFile {
public:
    explicit HelperPdfFile(PdfInput input)
        : m_input(std::make_shared<const PdfInput>(std::move(input))) {}

    bool readAll(const std::function<void(Data::Bytes)>& take, ErrorOut error) override {
        const auto buffer = std::make_unique_for_overwrite<std::uint8_t[]>(readPiece);
        off_t offset = 0;
        for (;;) {
            const ssize_t count = host::retried(
                [&] { return ::pread(m_input->descriptor(), buffer.get(), readPiece, offset); });
            if (count < 0)
                return fail(error, makeServiceError(errno, m_input->url));
            if (count == 0)
                return true;
            take({buffer.get(), static_cast<std::size_t>(count)});
            offset += count;
        }
    }

    [[nodiscard]] const std::shared_ptr<const PdfInput>& input() const { return m_input; }

private:
    std::shared_ptr<const PdfInput> m_input;
};

/// What a helper said of a document. Nothing of it is believed that could do harm.
struct PdfInformation {
    bool isLocked = false;
    std::uint32_t pageCount = 0;
    std::optional<std::string> author;
    std::optional<std::string> subject;
    std::optional<Date> creationDate;
    std::optional<Date> modificationDate;
};

/// Takes a text of the given size off the front of what a helper sent. False when there is less.
bool takeText(std::string_view& sent, std::uint32_t size, std::optional<std::string>& text) {
    if (size == reader::noText)
        return true;
    if (size > sent.size() || !isValidUTF8(sent.substr(0, size)))
        return false;
    text = sent.substr(0, size);
    sent.remove_prefix(size);
    return true;
}

bool takeDate(std::uint32_t isThere, double seconds, std::optional<Date>& date) {
    if (isThere == 0)
        return true;
    date = Date{seconds};
    return std::isfinite(seconds);
}

std::optional<PdfInformation> informationOf(const HelperAnswer& answer) {
    const Reply& reply = answer.reply;
    PdfInformation information;
    information.isLocked = reply.isLocked != 0;
    std::string_view sent = answer.text;
    const bool isSound =
        reply.outcome == Outcome::Done && takeText(sent, reply.authorSize, information.author) &&
        takeText(sent, reply.subjectSize, information.subject) && sent.empty() &&
        takeDate(reply.hasCreationDate, reply.creationDate, information.creationDate) &&
        takeDate(reply.hasModificationDate, reply.modificationDate, information.modificationDate);
    information.pageCount = reply.pageCount;
    return isSound ? std::optional(std::move(information)) : std::nullopt;
}

/// A document that a helper opened, for as long as anybody needs it.
struct OpenedPdf {
    OpenedPdf(std::shared_ptr<const PdfInput> from, PdfInformation said)
        : input(std::move(from)), information(std::move(said)) {}
    ~OpenedPdf() { host::letIdleHelperClose(); }
    OpenedPdf(const OpenedPdf&) = delete;
    OpenedPdf& operator=(const OpenedPdf&) = delete;

    std::shared_ptr<const PdfInput> input;
    PdfInformation information;
};

/// The document that the helper has open, where it is the same file in the same state.
std::shared_ptr<const OpenedPdf> sameDocument(const HelperProcess& helper, const PdfInput& input) {
    auto opened = std::static_pointer_cast<const OpenedPdf>(helper.openDocument.lock());
    if (opened && identityOf(opened->input->file->status) != identityOf(input.file->status))
        opened.reset();
    return opened;
}

bool askToOpen(HelperLease& lease, const PdfInput& input, HelperAnswer& answer) {
    Request request;
    request.ask = Ask::OpenDocument;
    request.size = input.size();
    return lease.ask(request, input.descriptor(), answer);
}

void setOpenDocument(HelperLease& lease, const std::shared_ptr<const OpenedPdf>& document) {
    lease.helper()->holdsDocument = document && document->input->size() > reader::longestCopied;
    lease.helper()->openDocument = document;
}

/// None for what is no document; a helper whose answer does not add up is ended.
std::shared_ptr<const OpenedPdf> openInHelper(HelperLease& lease,
                                              const std::shared_ptr<const PdfInput>& input) {
    HelperAnswer answer;
    if (!askToOpen(lease, *input, answer))
        return nullptr;
    std::optional<PdfInformation> information = informationOf(answer);
    if (!information && answer.reply.outcome == Outcome::Done) {
        lease.end();
        return nullptr;
    }
    std::shared_ptr<const OpenedPdf> document;
    if (information)
        document = std::make_shared<const OpenedPdf>(input, *std::move(information));
    setOpenDocument(lease, document);
    return document;
}

/// Asks something about the first page, and opens the document before where the helper does not
/// have it open. A helper that lacks the fonts is replaced by one that has them.
bool askOfPage(const std::shared_ptr<const OpenedPdf>& document, Request request,
               HelperAnswer& answer) {
    HelperMeans means = document->input->means();
    HelperLease lease(means);
    // Once for a helper that had ended while it waited, once for one without fonts.
    for (int attempt = 0; attempt < 3 && lease.helper(); ++attempt) {
        if (lease.helper()->openDocument.lock() != document) {
            if (!askToOpen(lease, *document->input, answer) ||
                answer.reply.outcome != Outcome::Done)
                return false;
            setOpenDocument(lease, document);
        }
        switch (lease.helper()->ask(request, -1, answer)) {
            case HelperProcess::Exchange::Answered:
                if (answer.reply.outcome != Outcome::FontsWanted)
                    return answer.reply.outcome == Outcome::Done;
                means.hasFonts = true;
                request.spentMilliseconds = answer.reply.spentMilliseconds;
                break;
            case HelperProcess::Exchange::NotAsked:
                break;
            case HelperProcess::Exchange::Failed:
                lease.end();
                return false;
        }
        lease.replace(means);
    }
    return false;
}

class HelperPdfPage final : public PdfPage {
public:
    HelperPdfPage(std::shared_ptr<const OpenedPdf> document, const Reply& reply)
        : m_document(std::move(document)),
          m_width(reply.cropBoxWidth),
          m_height(reply.cropBoxHeight),
          m_rotation(reply.rotation) {}

    double cropBoxWidth() const override { return m_width; }
    double cropBoxHeight() const override { return m_height; }
    int rotation() const override { return m_rotation; }

    std::optional<Image> draw(std::uint32_t width, std::uint32_t height) override {
        Request request;
        request.ask = Ask::DrawPage;
        request.width = width;
        request.height = height;
        HelperAnswer answer;
        if (width == 0 || height == 0 || std::max(width, height) > reader::longestDrawnSide ||
            !askOfPage(m_document, request, answer))
            return std::nullopt;
        std::optional<Image> image = host::imageOf(answer);
        if (image && (image->width != width || image->height != height))
            return std::nullopt;
        return image;
    }

private:
    std::shared_ptr<const OpenedPdf> m_document;
    double m_width;
    double m_height;
    int m_rotation;
};

bool isLength(double length) {
    return std::isfinite(length) && length >= 0;
}

class HelperPdfDocument final : public PdfDocument {
public:
    explicit HelperPdfDocument(std::shared_ptr<const OpenedPdf> document)
        : m_document(std::move(document)) {}

    bool isLocked() const override { return information().isLocked; }
    std::optional<std::string> author() const override { return information().author; }
    std::optional<std::string> subject() const override { return information().subject; }
    std::optional<Date> creationDate() const override { return information().creationDate; }
    std::optional<Date> modificationDate() const override { return information().modificationDate; }
    std::uint32_t pageCount() const override { return information().pageCount; }

    std::unique_ptr<PdfPage> firstPage() override {
        Request request;
        request.ask = Ask::DescribePage;
        HelperAnswer answer;
        if (isLocked() || pageCount() == 0)
            return nullptr;
        const bool isAnswered = askOfPage(m_document, request, answer);
        const Reply& reply = answer.reply;
        if (isAnswered && reply.hasFirstPage == 0)
            return nullptr;
        const bool isSound =
            isAnswered && isLength(reply.cropBoxWidth) && isLength(reply.cropBoxHeight);
        return std::make_unique<HelperPdfPage>(m_document, isSound ? reply : Reply());
    }

private:
    [[nodiscard]] const PdfInformation& information() const { return m_document->information; }

    std::shared_ptr<const OpenedPdf> m_document;
};

Error corruptDocument(const URL& url) {
    return makeFileError(PVFileErrorCode::Corrupt, url);
}

Error unreadableDocument(const URL& url) {
    Error::UserInfo info{
        {std::string(PVURLErrorKey), url},
        {std::string(PVLocalizedFailureReasonErrorKey), std::string(missingHelper)}};
    return Error(PVFileErrorDomain, static_cast<std::int64_t>(PVFileErrorCode::Corrupt),
                 std::move(info));
}

class HelperPdfDocuments final : public PdfDocuments {
public:
    std::unique_ptr<PdfFile> openFile(const URL& url, ErrorOut error) override {
        if (!url.isFileURL())
            return fail(error, makeServiceError(ENOENT, url));
        PdfInput input{url, host::heldOrOpened(url.path())};
        if (!input.file)
            return fail(error, makeServiceError(fileErrno(errno), url));
        const mode_t mode = input.file->status.st_mode;
        if (!S_ISREG(mode))
            return fail(error, makeServiceError(S_ISDIR(mode) ? EISDIR : EBADMSG, url));
        return std::make_unique<HelperPdfFile>(std::move(input));
    }

    std::unique_ptr<PdfDocument> openDocument(PdfFile& file, ErrorOut error) override {
        const std::shared_ptr<const PdfInput> input = static_cast<HelperPdfFile&>(file).input();
        HelperLease lease(input->means());
        if (!lease.helper())
            return fail(error, unreadableDocument(input->url));
        std::shared_ptr<const OpenedPdf> document = sameDocument(*lease.helper(), *input);
        if (!document)
            document = openInHelper(lease, input);
        if (!document)
            return fail(error, corruptDocument(input->url));
        return std::make_unique<HelperPdfDocument>(std::move(document));
    }

private:
    /// A socket, or a device that is not there, can't even be opened; it is no regular file either.
    static int fileErrno(int errnoValue) {
        return errnoValue == ENXIO || errnoValue == ENODEV ? EBADMSG : errnoValue;
    }
};

}  // namespace

PdfDocuments& PdfDocuments::host() {
    static HelperPdfDocuments documents;
    return documents;
}

}  // namespace parvel
