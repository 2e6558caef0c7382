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

#include <unistd.h>

#include "cli/Command.h"
#include "cli/Interrupt.h"
#include "cli/Messages.h"
#include "cli/Output.h"

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
          m_format(ResultFormat::make(options.form, options.makeText)),
          m_output(STDOUT_FILENO) {}

    int run();

private:
    struct Taken {
        std::size_t index;
        FoundPath found;
    };
    struct Printed {
        std::string text;
        std::string failure;
    };

    void workThrough();
    std::optional<Taken> take();
    void waitForRoom();
    [[nodiscard]] Result resultOf(const FoundPath& found, CallLog& log) const;
    void deliver(std::size_t index, Printed printed);
    void print(const Printed& printed);

    const BatchOptions& m_options;
    PathSource& m_source;
    const PathWork& m_work;
    const std::unique_ptr<ResultFormat> m_format;

    std::mutex m_sourceMutex;
    std::size_t m_taken = 0;

    std::mutex m_outputMutex;
    std::condition_variable m_room;
    Output m_output;
    std::map<std::size_t, Printed> m_waiting;  ///< results behind one that is not known yet
    std::size_t m_printed = 0;
    bool m_hasResult = false;
    bool m_hasFailure = false;

    std::atomic<unsigned> m_delivering{0};
    std::atomic<bool> m_stopped{false};
};

int Batch::run() {
    m_output.append(m_format->opening());
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
    m_output.append(m_format->closing());
    const bool delivered = m_output.finish(m_options.command);
    return delivered && !m_hasFailure ? kSuccess : kFailure;
}

void Batch::workThrough() {
    CallLog log(m_options.reasonLevel);
    while (const std::optional<Taken> taken = take()) {
        const Result result = resultOf(taken->found, log);
        Printed printed;
        m_format->append(result, printed.text);
        if (!result.succeeded())
            printed.failure = failureLine(m_options.command, result);
        deliver(taken->index, std::move(printed));
    }
}

std::optional<Batch::Taken> Batch::take() {
    const std::lock_guard lock(m_sourceMutex);
    if (m_format->keepsOrder())
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

void Batch::deliver(std::size_t index, Printed printed) {
    ++m_delivering;
    const std::lock_guard lock(m_outputMutex);
    --m_delivering;
    if (!m_format->keepsOrder()) {
        print(printed);
    } else {
        m_waiting.emplace(index, std::move(printed));
        while (!m_waiting.empty() && m_waiting.begin()->first == m_printed) {
            print(m_waiting.begin()->second);
            m_waiting.erase(m_waiting.begin());
            ++m_printed;
        }
        m_room.notify_all();
    }
    // The next thread in the queue flushes for this one too.
    if (m_delivering == 0)
        m_output.flushForReader();
    m_stopped = m_output.failed();
}

void Batch::print(const Printed& printed) {
    if (!printed.text.empty()) {
        if (m_hasResult)
            m_output.append(m_format->separator());
        m_hasResult = true;
        m_output.append(printed.text);
    }
    if (!printed.failure.empty()) {
        m_hasFailure = true;
        m_output.flushForReader();
        writeToStandardError(printed.failure);
    }
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
