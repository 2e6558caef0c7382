#pragma once

#include <memory>
#include <string>

#include "cli/Result.h"

namespace parvel::cli {

/// How results are printed: text for people, one JSON array, JSON a line each, or one XML property
/// list.
enum class OutputForm { Text, Json, JsonLines, PropertyList };

class ResultFormat;
using MakeResultFormat = std::unique_ptr<ResultFormat> (*)();

/// A title in bold, and a line a field of the record.
std::unique_ptr<ResultFormat> makeTextFormat();
/// A line a result, with what was done.
std::unique_ptr<ResultFormat> makeOutcomeFormat();
/// A line an attribute.
std::unique_ptr<ResultFormat> makeAttributesFormat();
std::unique_ptr<ResultFormat> makePropertyListFormat();

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

    /// `makeText` is the text that people get.
    static std::unique_ptr<ResultFormat> make(OutputForm form,
                                              MakeResultFormat makeText = makeTextFormat);
};

/// A list of that one result.
std::string listOfOne(OutputForm form, const Result& result);

}  // namespace parvel::cli
