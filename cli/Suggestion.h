#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace parvel::cli {

/// The end of a message about a word that is not known: the known one that was most likely meant,
/// which it begins, or is a slip or two away from. Empty where none is near.
std::string suggestionFor(std::string_view word, const std::vector<std::string_view>& known);

}  // namespace parvel::cli
