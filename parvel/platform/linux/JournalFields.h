#pragma once

#include <array>
#include <string>

#include "parvel/platform/LogSink.h"

namespace parvel {

/// A log line as the journal's native fields: MESSAGE, PRIORITY (5 for default, 7 for debug, 3 for
/// error, 2 for fault), SUBSYSTEM and CATEGORY, each as "NAME=value".
[[nodiscard]] std::array<std::string, 4> journalFields(const LogLine& line);

}  // namespace parvel
