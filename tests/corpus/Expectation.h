#pragma once

#include <memory>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

#include <nlohmann/json_fwd.hpp>

#include "parvel/foundation/Error.h"
#include "parvel/foundation/Value.h"
#include "parvel/metadata/PVAssetType.h"

namespace parvel::testing {

/// What inspecting one asset of the corpus must give; a row of expected.json, whose form
/// make_expectations.py describes.
class Expectation {
public:
    /// Every row, in the file's order.
    static std::vector<Expectation> all();

    /// The asset, relative to the corpus.
    [[nodiscard]] std::string file() const;
    /// The file's name in letters, digits and underscores, for a test's name.
    [[nodiscard]] std::string testName() const;
    [[nodiscard]] PVAssetType type() const;
    /// Whether there is to be a record, where the file itself keeps an identity or keeps none.
    [[nodiscard]] bool hasRecord(bool keepsIdentity) const;
    /// Whether there may be any record in place of the error: readers disagree on the file.
    [[nodiscard]] bool isDisputed() const;
    /// The error beside no record; none where there is to be none.
    [[nodiscard]] std::optional<Error> error(const URL& url) const;

    /// The record's entries as they must be.
    [[nodiscard]] nlohmann::json record(bool withCover) const;

    friend void PrintTo(const Expectation& expectation, std::ostream* out) {
        *out << expectation.file();
    }

private:
    explicit Expectation(nlohmann::json row);

    std::shared_ptr<const nlohmann::json> m_row;
};

/// A line for each entry that is missing, unexpected or different, both ways. A text "@/…" stands
/// for a path below the root.
std::vector<std::string> differences(const Dictionary& actual, const nlohmann::json& expected,
                                     const std::string& root);

}  // namespace parvel::testing
