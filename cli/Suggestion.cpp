#include "cli/Suggestion.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace parvel::cli {
namespace {

/// Words of fewer letters resemble too many others.
constexpr std::size_t kShortest = 3;
constexpr std::size_t kMostSlips = 2;
/// No known word is nearly as long.
constexpr std::size_t kLongest = 64;

/// How many letters must be put in, left out, replaced or exchanged with the next one.
std::size_t slipsBetween(std::string_view word, std::string_view other) {
    std::vector<std::size_t> last;
    std::vector<std::size_t> above(other.size() + 1);
    std::iota(above.begin(), above.end(), std::size_t{0});
    for (std::size_t i = 1; i <= word.size(); ++i) {
        std::vector<std::size_t> row(other.size() + 1, i);
        for (std::size_t j = 1; j <= other.size(); ++j) {
            const bool isSame = word[i - 1] == other[j - 1];
            row[j] = std::min({above[j] + 1, row[j - 1] + 1, above[j - 1] + (isSame ? 0 : 1)});
            if (i > 1 && j > 1 && word[i - 1] == other[j - 2] && word[i - 2] == other[j - 1])
                row[j] = std::min(row[j], last[j - 2] + 1);
        }
        last = std::exchange(above, std::move(row));
    }
    return above.back();
}

std::string_view wordNearTo(std::string_view word, const std::vector<std::string_view>& known) {
    std::string_view nearest;
    if (word.size() < kShortest || word.size() > kLongest)
        return nearest;
    std::size_t fewest = kMostSlips + 1;
    for (const std::string_view each : known) {
        const std::size_t slips = each.starts_with(word) ? 1 : slipsBetween(word, each);
        // Where most of a short word differs, it is another one.
        if (slips < fewest && slips * 2 < each.size()) {
            fewest = slips;
            nearest = each;
        }
    }
    return nearest;
}

}  // namespace

std::string suggestionFor(std::string_view word, const std::vector<std::string_view>& known) {
    const std::string_view near = wordNearTo(word, known);
    return near.empty() ? std::string() : "; do you mean " + std::string(near) + "?";
}

}  // namespace parvel::cli
