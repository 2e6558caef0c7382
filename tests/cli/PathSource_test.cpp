#include <functional>

#include <gtest/gtest.h>

#include "cli/PathSource.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using cli::FoundPath;
using cli::PathOptions;
using cli::PathSource;

/// The PATHs that a walk below the folder gives, with the act done after the first of them.
std::vector<std::string> walked(const TemporaryDirectory& folder, const PathOptions& options,
                                const std::function<void()>& act = {}) {
    PathSource source({folder.path().string()}, options);
    std::vector<std::string> paths;
    while (const std::optional<FoundPath> found = source.next()) {
        paths.push_back(found->path.substr(folder.path().string().size() + 1));
        if (paths.size() == 1 && act)
            act();
    }
    return paths;
}

TEST(PathSource, FindsWhatIsMadeWhileItWalks) {
    const TemporaryDirectory folder;
    folder.write("a.epub", "");
    folder.write("b/c.epub", "");
    PathOptions options;
    options.recursive = true;

    EXPECT_EQ(walked(folder, options, [&] { folder.write("b/d.epub", ""); }),
              (std::vector<std::string>{"a.epub", "b/c.epub", "b/d.epub"}));
}

TEST(PathSource, FindsNothingThatTheWorkItselfMakes) {
    const TemporaryDirectory folder;
    folder.write("a.epub", "");
    folder.write("b/c.epub", "");
    PathOptions options;
    options.recursive = options.walksFirst = true;

    EXPECT_EQ(walked(folder, options, [&] { folder.write("b/d.epub", ""); }),
              (std::vector<std::string>{"a.epub", "b/c.epub"}));
}

TEST(PathSource, LeavesOutWhatLiesInTheTarget) {
    const TemporaryDirectory folder;
    folder.write("a.epub", "");
    folder.write("b/c.epub", "");
    folder.write("b/deeper/d.epub", "");
    PathOptions options;
    options.recursive = options.walksFirst = true;
    options.target = folder.url("x/../b/");

    EXPECT_EQ(walked(folder, options), (std::vector<std::string>{"a.epub", "b/deeper/d.epub"}));
}

}  // namespace
}  // namespace parvel::testing
