#pragma once

#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "cli/AssetWalk.h"
#include "cli/CommandLine.h"
#include "parvel/foundation/URL.h"

namespace parvel::cli {

/// The options that say which PATHs a command works on.
struct PathOptions {
    std::optional<std::string> filesFrom;
    bool nulEnded = false;
    bool recursive = false;
    bool walksFirst = false;  ///< a walk ends before its first PATH is worked on: that work changes
                              ///< what the walk would find
    std::optional<URL> target;  ///< a walk leaves out what lies in this folder already

    void declare(CommandLine& line);
    /// The same without -r.
    void declareSources(CommandLine& line);
};

/// PATHs out of a file, a line each (or NUL-ended), read as they are asked for. Empty ones are left
/// out.
class PathFile {
public:
    /// "-" is standard input. Throws UsageError where the file can't be opened.
    PathFile(const std::string& name, bool nulEnded);
    ~PathFile();
    PathFile(const PathFile&) = delete;
    PathFile& operator=(const PathFile&) = delete;

    std::optional<FoundPath> next();

private:
    bool fill();

    std::string m_name;
    int m_descriptor;
    char m_separator;
    std::string m_buffer;
    std::size_t m_offset = 0;
    bool m_ended = false;
    int m_errno = 0;
};

/// All PATHs of a command, one after the other: the operands, then those of --files-from; with -r
/// every asset below those that are folders.
class PathSource {
public:
    /// Throws UsageError where there is nothing to take PATHs from.
    PathSource(std::vector<std::string> operands, const PathOptions& options);

    std::optional<FoundPath> next();
    /// How many PATHs there will be, where that is known before.
    [[nodiscard]] std::optional<std::size_t> count() const;

private:
    std::optional<FoundPath> nextGiven();
    std::optional<FoundPath> nextFound();
    void begin(std::string folder);

    std::deque<std::string> m_operands;
    std::unique_ptr<PathFile> m_file;
    std::unique_ptr<AssetWalk> m_walk;
    std::deque<FoundPath> m_found;
    const bool m_recursive;
    const bool m_walksFirst;
    const std::optional<URL> m_target;
};

}  // namespace parvel::cli
