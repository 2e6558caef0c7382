#pragma once

#include <optional>
#include <string_view>

namespace parvel::reader {

/// Seconds since 2001-01-01 00:00:00 UTC of a date as PDF documents write it (ISO 32000, 7.9.4):
/// "D:YYYYMMDDHHmmSSOHH'mm'", where all behind the year may be missing, the "D:" too, and no zone
/// means UTC. Behind the seconds anything may follow that is no zone. "191" and two more digits for
/// a year, as an old writer of such files had it from 2000 on, count the years from 1900. None for
/// any other text, and for a day or time that does not exist.
[[nodiscard]] std::optional<double> secondsOfPdfDate(std::string_view text);

}  // namespace parvel::reader
