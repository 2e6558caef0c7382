#include "parvel/platform/linux/HelperPool.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include <algorithm>
#include <atomic>
#include <utility>

#include "parvel/platform/ReaderProgram.h"

namespace parvel::host {

namespace {

/// After so many documents and images a helper is replaced: nothing that adds up in it, nor what
/// one of them might have done to it, lasts.
constexpr unsigned servedInputs = 1000;

/// The helper that waits for the next call, of any thread.
std::atomic<HelperProcess*> idleHelper{nullptr};

std::unique_ptr<HelperProcess> takeIdle() {
    return std::unique_ptr<HelperProcess>(idleHelper.exchange(nullptr, std::memory_order_acq_rel));
}

/// Lets the helper wait, unless one does already.
void keepIdle(std::unique_ptr<HelperProcess> helper) {
    HelperProcess* none = nullptr;
    if (idleHelper.compare_exchange_strong(none, helper.get(), std::memory_order_acq_rel))
        static_cast<void>(helper.release());
}

/// Nobody's document may stay open in a helper that waits: it would keep its file system busy.
/// False where the helper is not to wait any longer, as one that was started for a very long input.
bool closeForgottenDocument(HelperProcess& helper) {
    if (!helper.openDocument.expired())
        return true;
    if (helper.means().inputBytes > reader::ordinaryInput)
        return false;
    if (!helper.holdsDocument)
        return true;
    reader::Request request;
    request.ask = reader::Ask::CloseDocument;
    helper.holdsDocument = false;
    return helper.tell(request);
}

std::unique_ptr<HelperProcess> startHelper(const HelperMeans& means) {
    return HelperProcess::start(readerProgramPath(), means);
}

}  // namespace

void letIdleHelperClose() {
    std::unique_ptr<HelperProcess> helper = takeIdle();
    if (helper && helper->isOurs() && closeForgottenDocument(*helper))
        keepIdle(std::move(helper));
}

void endIdleHelper() {
    takeIdle().reset();
}

HelperLease::HelperLease(const HelperMeans& wanted) : m_helper(takeIdle()) {
    HelperMeans means = wanted;
    if (m_helper && m_helper->isOurs() && m_helper->inputCount() < servedInputs) {
        const HelperMeans& has = m_helper->means();
        if (has.inputBytes >= wanted.inputBytes && (has.hasFonts || !wanted.hasFonts))
            return;
        means.hasFonts = has.hasFonts || wanted.hasFonts;
    }
    replace(means);
}

HelperLease::~HelperLease() {
    if (m_helper && closeForgottenDocument(*m_helper))
        keepIdle(std::move(m_helper));
}

bool HelperLease::ask(const reader::Request& request, int descriptor, HelperAnswer& answer) {
    if (!m_helper)
        return false;
    HelperProcess::Exchange exchange = m_helper->ask(request, descriptor, answer);
    if (exchange == HelperProcess::Exchange::NotAsked) {
        const HelperMeans means = m_helper->means();
        replace(means);
        if (m_helper)
            exchange = m_helper->ask(request, descriptor, answer);
    }
    if (exchange == HelperProcess::Exchange::Answered)
        return true;
    m_helper.reset();
    return false;
}

void HelperLease::replace(const HelperMeans& wanted) {
    m_helper.reset();
    m_helper = startHelper(wanted);
}

std::shared_ptr<const std::uint8_t[]> sealedBytes(const FileDescriptor& file, std::uint64_t size) {
    constexpr int neededSeals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE;
    struct stat status;
    if (!file || size == 0 || ::fstat(file.get(), &status) != 0 || status.st_size < 0 ||
        static_cast<std::uint64_t>(status.st_size) != size)
        return nullptr;
    const int seals = ::fcntl(file.get(), F_GET_SEALS);
    if (seals < 0 || (seals & neededSeals) != neededSeals)
        return nullptr;
    // Nothing can change or cut short what is sealed, so it need not be copied.
    void* bytes = ::mmap(nullptr, size, PROT_READ, MAP_SHARED | MAP_POPULATE, file.get(), 0);
    if (bytes == MAP_FAILED)
        return nullptr;
    return {static_cast<const std::uint8_t*>(bytes),
            [bytes, size](const std::uint8_t*) { ::munmap(bytes, size); }};
}

std::optional<Image> imageOf(const HelperAnswer& answer) {
    const reader::Reply& reply = answer.reply;
    if (reply.outcome != reader::Outcome::Done || reply.width == 0 || reply.height == 0 ||
        reply.stride % 4 != 0 || reply.stride / 4 < reply.width ||
        reply.size != std::uint64_t{reply.stride} * reply.height)
        return std::nullopt;
    Image image{reply.width, reply.height, reply.stride, sealedBytes(answer.file, reply.size)};
    return image.bytes ? std::optional(std::move(image)) : std::nullopt;
}

}  // namespace parvel::host
