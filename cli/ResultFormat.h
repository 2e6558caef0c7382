#pragma once

#include <memory>
#include <string>

#include "cli/Result.h"

namespace parvel::cli {

/// How results are printed: text for people, one JSON array, JSON a line each, or one XML property
/// list.
enum class OutputForm { Text, Json, JsonLines, PropertyList };

/// Writes results in one form. `append` may be called from many threads at once.
class ResultFormat {
public:
    virtual ~ResultFormat() = default;

    virtual void append(const Result& result, std::string& out) const = 0;
    [[nodiscard]] virtual std::string_view opening() const { return {}; }
    [[nodiscard]] virtual std::string_view separator() const { return {}; }
    [[nodiscard]] virtual std::string_view closing() const { return {}; }
    /// Whether results stand in the order of their PATHs.
    [[nodiscard]] virtual bool keepsOrder() const { return true; }

    static std::unique_ptr<ResultFormat> make(OutputForm form);
};

std::unique_ptr<ResultFormat> makeTextFormat();
std::unique_ptr<ResultFormat> makePropertyListFormat();

}  // namespace parvel::cli
