#pragma once

#include <string>

#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::reader {

/// The host's files that drawing may need: fonts, and the tables of the PDF library. They are
/// opened before the walls go up. Behind them nothing can be opened; code that asks for a path is
/// answered by a signal handler that knows these files alone, and a document that came open.

/// Opens a file for later. Before the walls go up.
void keepHostFile(const std::string& path);
/// Opens every regular file in a folder and those in it.
void keepHostFolder(const std::string& path);

/// Answers from now on each system call that the filter traps: an open with a descriptor of the
/// kept file, or as if the file were not there.
void answerTrappedCalls();

/// While it lives, opening its path gives another descriptor of a file that came open.
class OfferedFile {
public:
    explicit OfferedFile(int descriptor);
    ~OfferedFile();
    OfferedFile(const OfferedFile&) = delete;
    OfferedFile& operator=(const OfferedFile&) = delete;

    [[nodiscard]] const std::string& path() const { return m_path; }
    [[nodiscard]] int descriptor() const { return m_descriptor; }

private:
    std::string m_path;
    int m_descriptor;
};

/// While it lives, asking for a file that was not kept ends the process, with the reply to the
/// request that says that fonts are wanted.
class EndWhenFileIsWanted {
public:
    /// Null for not at all.
    explicit EndWhenFileIsWanted(const Request* request);
    ~EndWhenFileIsWanted();
    EndWhenFileIsWanted(const EndWhenFileIsWanted&) = delete;
    EndWhenFileIsWanted& operator=(const EndWhenFileIsWanted&) = delete;
};

}  // namespace parvel::reader
