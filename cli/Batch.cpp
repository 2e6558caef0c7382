#include "cli/Batch.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <charconv>
#include <condition_variable>
#include <map>
#include <mutex>
#include <new>
#include <system_error>
#include <thread>
#include <vector>

#include "cli/Interrupt.h"
#include "cli/ResultPrinter.h"

namespace parvel::cli {
namespace {

constexpr unsigned kMostJobs = 512;
/// How many results may wait for an earlier one, for each thread.
constexpr std::size_t kWaitingPerJob = 8;

Result failedResult(const std::string& path, int errnoValue) {
    Result result = resultForPath(path);
    result.error = makePOSIXError(errnoValue, urlOfPath(path));
    return result;
}

class Batch {
public:
    Batch(const BatchOptions& options, PathSource& source, const PathWork& work)
        : m_options(options),
          m_source(source),
          m_work(work),
          m_printer(options.command, options.form, options.makeText) {}

    int run();

private:
    struct Taken {
        std::size_t index;
        FoundPath found;
    };

    void workThrough();
    std::optional<Taken> take();
    void waitForRoom();
    [[nodiscard]] Result resultOf(const FoundPath& found, CallLog& log) const;
    void deliver(std::size_t index, PrintedResult printed);

    const BatchOptions& m_options;
    PathSource& m_source;
    const PathWork& m_work;

    std::mutex m_sourceMutex;
    std::size_t m_taken = 0;

    std::mutex m_outputMutex;
    std::condition_variable m_room;
    ResultPrinter m_printer;
    std::map<std::size_t, PrintedResult> m_waiting;  ///< results behind one that is not known yet
    std::size_t m_printed = 0;

    std::atomic<unsigned> m_delivering{0};
    std::atomic<bool> m_stopped{false};
};

int Batch::run() {
    const std::size_t paths = m_source.count().value_or(m_options.jobs);
    std::vector<std::thread> threads;
    for (std::size_t i = 1; i < std::min<std::size_t>(m_options.jobs, paths); ++i) {
        try {
            threads.emplace_back([this] { workThrough(); });
        } catch (const std::system_error&) {
            break;  // the system has no more threads; those that run do the work
        }
    }
    workThrough();
    for (std::thread& thread : threads)
        thread.join();
    return m_printer.finish();
}

void Batch::workThrough() {
    CallLog log(m_options.reasonLevel);
    while (const std::optional<Taken> taken = take()) {
        deliver(taken->index, m_printer.inForm(resultOf(taken->found, log)));
    }
}

std::optional<Batch::Taken> Batch::take() {
    const std::lock_guard lock(m_sourceMutex);
    if (m_printer.keepsOrder())
        waitForRoom();
    if (interrupted() || m_stopped)
        return std::nullopt;
    std::optional<FoundPath> found = m_source.next();
    if (!found)
        return std::nullopt;
    return Taken{m_taken++, std::move(*found)};
}

void Batch::waitForRoom() {
    std::unique_lock lock(m_outputMutex);
    m_room.wait(lock, [this] { return m_taken < m_printed + kWaitingPerJob * m_options.jobs; });
}

Result Batch::resultOf(const FoundPath& found, CallLog& log) const {
    log.clear();
    if (found.readErrno != 0)
        return failedResult(found.path, found.readErrno);
    try {
        Result result = m_work(found.path);
        if (!result.succeeded() && result.reason.empty())
            result.reason = log.reason();
        return result;
    } catch (const std::bad_alloc&) {
        return failedResult(found.path, ENOMEM);
    }
}

void Batch::deliver(std::size_t index, PrintedResult printed) {
    ++m_delivering;
    const std::lock_guard lock(m_outputMutex);
    --m_delivering;
    if (!m_printer.keepsOrder()) {
        m_printer.print(printed);
    } else {
        m_waiting.emplace(index, std::move(printed));
        while (!m_waiting.empty() && m_waiting.begin()->first == m_printed) {
            m_printer.print(m_waiting.begin()->second);
            m_waiting.erase(m_waiting.begin());
            ++m_printed;
        }
        m_room.notify_all();
    }
    // The next thread in the queue flushes for this one too.
    if (m_delivering == 0)
        m_printer.flushForReader();
    m_stopped = m_printer.hasLostOutput();
}

}  // namespace

unsigned jobsFromOption(const std::optional<std::string>& option) {
    if (!option)
        return std::clamp(std::thread::hardware_concurrency(), 1U, kMostJobs);
    unsigned jobs = 0;
    const char* end = option->data() + option->size();
    if (std::from_chars(option->data(), end, jobs).ptr != end || jobs < 1 || jobs > kMostJobs)
        throw UsageError("-j " + *option + ": not a number from 1 to " + std::to_string(kMostJobs));
    return jobs;
}

int runOverPaths(const BatchOptions& options, PathSource& source, const PathWork& work) {
    return Batch(options, source, work).run();
}

}  // namespace parvel::cli
