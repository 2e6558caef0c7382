#include "parvel/platform/linux/JournalFields.h"

#include <sys/uio.h>
#include <systemd/sd-journal.h>
#include <unistd.h>

#include <cerrno>

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

class JournalLogSink final : public LogSink {
public:
    void write(const LogLine& line) override {
        if (!m_hasJournal)
            return;
        const int callersErrno = errno;
        std::array<std::string, 4> fields = journalFields(line);
        std::array<iovec, 4> list;
        for (std::size_t i = 0; i < fields.size(); ++i)
            list[i] = {fields[i].data(), fields[i].size()};
        // A line that can't be delivered is lost; logging never fails an operation.
        static_cast<void>(sd_journal_sendv(list.data(), static_cast<int>(list.size())));
        errno = callersErrno;
    }

private:
    // Without a journal sd_journal_sendv succeeds and does nothing, after the line was put
    // together.
    const bool m_hasJournal = access("/run/systemd/journal/socket", W_OK) == 0;
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
