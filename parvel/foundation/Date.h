#pragma once

#include <cstdint>
#include <string>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// A point in time: seconds since 2001-01-01 00:00:00 UTC.
struct PV_EXPORT Date {
    double secondsSinceReferenceDate = 0;

    static Date now();

    /// By value; NaN equals NaN, so that every date equals itself.
    friend bool operator==(const Date& left, const Date& right) {
        const double a = left.secondsSinceReferenceDate;
        const double b = right.secondsSinceReferenceDate;
        return a == b || (a != a && b != b);
    }
};

/// Seconds from 1970-01-01 to 2001-01-01, both 00:00:00 UTC.
inline constexpr std::int64_t kReferenceDateUnixSeconds = 978307200;

/// The date in UTC as ISO 8601 text, "2001-01-01T00:00:00Z", with as many fractional digits as the
/// exact value needs. A date outside the years 1 to 9999 has no such text and gives an empty one.
PV_EXPORT std::string isoText(const Date& date);

}  // namespace parvel
