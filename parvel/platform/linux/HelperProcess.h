#pragma once

#include <sys/types.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::host {

/// What a helper is started with.
struct HelperMeans {
    std::uint64_t inputBytes = reader::ordinaryInput;  ///< address space for its input
    bool hasFonts = false;
};

/// A reply as it came. Nothing in it has been judged but its length and that it is the request's.
struct HelperAnswer {
    reader::Reply reply;
    std::string_view text;  ///< what followed the header, until the next request
    FileDescriptor file;    ///< not open where none was sent
};

/// One running parvel-reader, for one thread at a time. It is no child that the application could
/// notice: no SIGCHLD comes of it and no wait for any child finds it, unless the application has
/// made itself the reaper of orphans. It inherits no descriptor, signal handler or signal mask, and
/// ends with this object.
class HelperProcess {
public:
    /// Starts the program and waits until it stands behind its walls. Null when it can't be had.
    static std::unique_ptr<HelperProcess> start(const std::string& program,
                                                const HelperMeans& means);
    ~HelperProcess();
    HelperProcess(const HelperProcess&) = delete;
    HelperProcess& operator=(const HelperProcess&) = delete;

    enum class Exchange {
        Answered,
        NotAsked,  ///< the process had ended before: another may be asked
        Failed,    ///< it ended over the request, or took too long and was ended
    };

    /// Asks, with a descriptor unless that is negative, and waits for the answer. Only a process
    /// that answered may be asked again.
    [[nodiscard]] Exchange ask(const reader::Request& request, int descriptor,
                               HelperAnswer& answer);

    /// Tells something that is not answered. False when the process had ended.
    bool tell(const reader::Request& request);

    [[nodiscard]] const HelperMeans& means() const { return m_means; }
    /// The walls that stand, of reader::Wall.
    [[nodiscard]] std::uint32_t walls() const { return m_walls; }
    /// How many documents and images it was given.
    [[nodiscard]] unsigned inputCount() const { return m_inputCount; }
    /// Whether this very process started it, not the one that it was forked from.
    [[nodiscard]] bool isOurs() const;

    /// Stands for the document that is open in it; gone when nobody needs that any longer.
    std::weak_ptr<const void> openDocument;
    bool holdsDocument = false;  ///< and whether its file is held, until it is told to close that

private:
    HelperProcess(FileDescriptor socket, FileDescriptor process, const HelperMeans& means);
    [[nodiscard]] bool send(const reader::Request& request, int descriptor) const;
    [[nodiscard]] bool receive(HelperAnswer& answer);
    [[nodiscard]] bool awaitReply() const;

    FileDescriptor m_socket;
    FileDescriptor m_process;  ///< not open on a host without process descriptors
    HelperMeans m_means;
    pid_t m_owner;
    std::uint32_t m_walls = 0;
    std::uint32_t m_number = 0;
    unsigned m_inputCount = 0;
    std::unique_ptr<char[]> m_text;
};

}  // namespace parvel::host
