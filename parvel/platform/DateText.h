#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/Date.h"
#include "parvel/foundation/PVExport.h"

namespace parvel {

/// The formatter of metadata dates: the user's locale's full date (weekday and month spelled out),
/// no time, today and yesterday as the locale's words for them; in the user's time zone. Made once,
/// on first use; callable from any thread. The text is for people, and only this formatter reads it
/// back.
class PV_EXPORT DateText {
public:
    virtual ~DateText() = default;
    [[nodiscard]] virtual std::string stringFromDate(const Date& date) = 0;
    /// None for any text that formatting the result would not give again.
    [[nodiscard]] virtual std::optional<Date> dateFromString(std::string_view text) = 0;

    static DateText& host();
};

}  // namespace parvel
