#pragma once

#include <string>
#include <string_view>

#include "parvel/foundation/Value.h"

namespace parvel::cli {

/// Property-list values as JSON, so that reading it back (JsonReader.h) gives equal values:
///
/// - a date is `{"$date": "2001-01-01T00:00:00Z"}`, outside the years 1 to 9999
///   `{"$date": seconds since 2001}`; bytes are `{"$data": "<base64>"}`; a real that is not finite
///   is `{"$real": "inf"|"-inf"|"nan"}`; the null marker is null;
/// - a dictionary whose only key would read as one of those three gets one more `$` before it;
/// - whole numbers are exact; reals are the shortest text that reads back equal, and always have a
///   point or an exponent, so that they stay reals;
/// - a byte of text that is no UTF-8 is the lone escape `\udcXX`. Control characters and the line
///   and paragraph separators are escaped too, so the text is safe on a terminal and one line.
void appendJson(const Value& value, std::string& out);
void appendJson(const Dictionary& dictionary, std::string& out);
void appendJsonString(std::string_view text, std::string& out);

}  // namespace parvel::cli
