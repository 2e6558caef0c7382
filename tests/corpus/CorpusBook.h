#pragma once

#include <cstdlib>
#include <filesystem>
#include <string>

#include "tests/corpus/Expectation.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// The folder that the environment names as the corpus; empty where it names none.
inline std::filesystem::path corpusFolder() {
    const char* folder = std::getenv("PARVEL_CORPUS");
    return folder ? folder : "";
}

/// Why a test over the corpus is skipped.
inline constexpr const char* kNoCorpus = "PARVEL_CORPUS names no folder of books";

/// A copy of one book of the corpus, without extended attributes, in a directory of its own.
class CorpusBook {
public:
    explicit CorpusBook(const Expectation& expectation) : m_expectation(expectation) {
        const std::filesystem::path copy = path();
        std::filesystem::create_directories(copy.parent_path());
        std::filesystem::copy(corpusFolder() / expectation.file(), copy,
                              std::filesystem::copy_options::recursive);
    }

    [[nodiscard]] const Expectation& expectation() const { return m_expectation; }
    /// What the expectation's "@" stands for.
    [[nodiscard]] std::string root() const { return m_directory.path().string(); }
    [[nodiscard]] std::string path() const { return m_directory / m_expectation.file(); }
    [[nodiscard]] URL url() const { return URL::fileURLWithPath(path()); }

private:
    Expectation m_expectation;
    TemporaryDirectory m_directory;
};

}  // namespace parvel::testing
