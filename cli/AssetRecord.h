#pragma once

#include <memory>
#include <optional>
#include <string>

#include "cli/CommandLine.h"
#include "cli/Result.h"
#include "parvel/metadata/PVAssetMetadata.h"

namespace parvel::cli {

/// What a command does with a PATH that can't be inspected.
enum class Uninspectable {
    Fails,           ///< its result has the error of the inspection
    HasItsURLAlone,  ///< the record holds no more than the PATH, which need not exist
};

/// The record that a command works on: what inspecting a PATH gives, or what --record says in its
/// place. After `read` it may be asked by many threads at once.
class AssetRecord {
public:
    explicit AssetRecord(Uninspectable uninspectable) : m_uninspectable(uninspectable) {}

    void declare(CommandLine& line);
    /// Reads the file of --record. Throws UsageError.
    void read();

    /// The record of the result's PATH. Where it is null, the result says why: it has the error of
    /// the inspection, and the reason out of its log.
    [[nodiscard]] AssetPtr forResult(Result& result) const;

private:
    Uninspectable m_uninspectable;
    std::optional<std::string> m_file;
    std::shared_ptr<const Dictionary> m_dictionary;
};

}  // namespace parvel::cli
