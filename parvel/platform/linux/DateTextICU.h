#pragma once

#include <memory>
#include <string>

#include "parvel/platform/DateText.h"

namespace parvel {

/// The user's locale for times as the environment names it ("de_DE.UTF-8"): the first of LC_ALL,
/// LC_TIME and LANG that is set and not empty, "C" where none is.
[[nodiscard]] std::string userTimeLocaleName();

/// A formatter for a locale named as in the environment, in the user's time zone.
[[nodiscard]] std::unique_ptr<DateText> makeDateTextICU(const std::string& localeName);

}  // namespace parvel
