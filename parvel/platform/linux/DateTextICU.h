#pragma once

#include <memory>
#include <string>

#include "parvel/platform/DateText.h"
#include "parvel/platform/linux/Libicui18n.h"

namespace parvel {

/// The user's locale for times as the environment names it ("de_DE.UTF-8"): the first of LC_ALL,
/// LC_TIME and LANG that is set and not empty, "C" where none is.
[[nodiscard]] std::string userTimeLocaleName();

/// A formatter for a locale named as in the environment, in the user's time zone. It writes empty
/// texts and reads none where the library is not complete.
[[nodiscard]] std::unique_ptr<DateText> makeDateTextICU(
    const std::string& localeName, const host::Libicui18n& (*icu)() = host::Libicui18n::host);

}  // namespace parvel
