#include "parvel/platform/linux/JournalFields.h"

#include <sys/uio.h>
#include <unistd.h>

#include <cerrno>

#include "parvel/platform/linux/Libsystemd.h"

namespace parvel {
namespace {

char journalPriority(LogLevel level) {
    switch (level) {
        case LogLevel::Debug:
            return '7';
        case LogLevel::Default:
            return '5';
        case LogLevel::Error:
            return '3';
        case LogLevel::Fault:
        case LogLevel::Off:
            break;
    }
    return '2';
}

/// Gives the caller's errno back; who logs a failure may read it after the line.
class KeptErrno {
public:
    KeptErrno() = default;
    ~KeptErrno() { errno = m_value; }
    KeptErrno(const KeptErrno&) = delete;
    KeptErrno& operator=(const KeptErrno&) = delete;

private:
    const int m_value = errno;
};

/// Without a journal sd_journal_sendv succeeds and does nothing, after the line was put together.
bool hasJournal() {
    const KeptErrno kept;
    return access("/run/systemd/journal/socket", W_OK) == 0;
}

class JournalLogSink final : public LogSink {
public:
    void write(const LogLine& line) override {
        if (!m_hasJournal)
            return;
        const KeptErrno kept;
        const host::Libsystemd& libsystemd = host::Libsystemd::host();
        if (!libsystemd.isComplete())
            return;
        std::array<std::string, 4> fields = journalFields(line);
        std::array<iovec, 4> list;
        for (std::size_t i = 0; i < fields.size(); ++i)
            list[i] = {fields[i].data(), fields[i].size()};
        // A line that can't be delivered is lost; logging never fails an operation.
        (void)libsystemd.sd_journal_sendv(list.data(), static_cast<int>(list.size()));
    }

private:
    const bool m_hasJournal = hasJournal();
};

}  // namespace

std::array<std::string, 4> journalFields(const LogLine& line) {
    return {"MESSAGE=" + line.message(), std::string("PRIORITY=") + journalPriority(line.level),
            "SUBSYSTEM=" + std::string(line.subsystem), "CATEGORY=" + std::string(line.category)};
}

LogSink& LogSink::host() {
    static JournalLogSink sink;
    return sink;
}

}  // namespace parvel
