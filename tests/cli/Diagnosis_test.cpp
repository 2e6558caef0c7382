#include <cerrno>

#include <gtest/gtest.h>

#include "cli/AssetDiagnosis.h"
#include "cli/HostDiagnosis.h"

namespace parvel::testing {
namespace {

std::vector<std::string> kindsOf(const std::vector<cli::Finding>& findings) {
    std::vector<std::string> kinds;
    for (const cli::Finding& finding : findings)
        kinds.emplace_back(finding.kind);
    return kinds;
}

/// A host without a trash.
class TrashlessService : public ForwardingFileSystemService {
public:
    TrashlessService() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}

    bool trashItem(const URL& item, std::optional<URL>*, ErrorOut error) override {
        return fail(error, makePOSIXError(EROFS, item));
    }
};

TEST(HostDiagnosis, FindsNothingWhereTheHelperIsConfined) {
    const ReaderConfinement confinement{.hasSystemCallFilter = true, .hasNoFiles = true};

    EXPECT_EQ(kindsOf(cli::findingsOfReader(confinement)), std::vector<std::string>());
}

TEST(HostDiagnosis, TellsThatTheHelperIsMissing) {
    EXPECT_EQ(kindsOf(cli::findingsOfReader(std::nullopt)), std::vector<std::string>{"noReader"});
}

TEST(HostDiagnosis, TellsWhichWallIsMissing) {
    EXPECT_EQ(kindsOf(cli::findingsOfReader(ReaderConfinement{.hasSystemCallFilter = true})),
              std::vector<std::string>{"noLandlock"});
    EXPECT_EQ(kindsOf(cli::findingsOfReader(ReaderConfinement{.hasNoFiles = true})),
              std::vector<std::string>{"noSystemCallFilter"});
}

TEST(AssetDiagnosis, TellsWhyAnItemCantBeTrashed) {
    TrashlessService service;

    const auto findings = cli::findingsOfTrash(service, URL::fileURLWithPath("/books/a.epub"));

    ASSERT_EQ(kindsOf(findings), std::vector<std::string>{"noTrash"});
    EXPECT_NE(findings.front().message.find("Read-only file system"), std::string::npos);
}

}  // namespace
}  // namespace parvel::testing
