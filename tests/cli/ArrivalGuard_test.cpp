#include <cerrno>

#include <gtest/gtest.h>

#include "cli/ArrivalGuard.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

class ArrivalGuard : public ::testing::Test {
protected:
    bool replace(const std::string& existing, const std::string& name) {
        return m_guard.replaceItem(m_folder.url(existing), m_folder.url(name),
                                   ReplaceOptions::Default, nullptr, &m_error);
    }

    TemporaryDirectory m_folder;
    cli::ArrivalGuard m_guard{FileSystemService::makeDefault()};
    std::optional<Error> m_error;
};

TEST_F(ArrivalGuard, KeepsWhatWasMovedThere) {
    m_folder.write("a", "1");
    m_folder.write("b", "2");
    ASSERT_TRUE(m_guard.moveItem(m_folder.url("a"), m_folder.url("place"), &m_error));

    EXPECT_FALSE(replace("place", "b"));

    EXPECT_EQ(m_error, makePOSIXError(EALREADY, m_folder.url("place")));
    EXPECT_EQ(m_folder.read("place"), "1");
    EXPECT_EQ(m_folder.read("b"), "2");
}

TEST_F(ArrivalGuard, KeepsWhatWasCopiedThere) {
    m_folder.write("a", "1");
    ASSERT_TRUE(m_guard.copyItem(m_folder.url("a"), m_folder.url("place"), &m_error));

    EXPECT_FALSE(replace("place", "a"));

    EXPECT_EQ(m_error, makePOSIXError(EALREADY, m_folder.url("place")));
}

TEST_F(ArrivalGuard, KeepsWhatReplacedAnother) {
    m_folder.write("place", "0");
    m_folder.write("a", "1");
    m_folder.write("b", "2");

    EXPECT_TRUE(replace("place", "a"));
    EXPECT_FALSE(replace("place", "b"));

    EXPECT_EQ(m_folder.read("place"), "1");
}

TEST_F(ArrivalGuard, ForgetsWhatMovedOn) {
    m_folder.write("a", "1");
    m_folder.write("b", "2");
    ASSERT_TRUE(m_guard.moveItem(m_folder.url("a"), m_folder.url("stage"), &m_error));
    ASSERT_TRUE(m_guard.moveItem(m_folder.url("stage"), m_folder.url("place"), &m_error));
    m_folder.write("stage", "3");

    EXPECT_TRUE(replace("stage", "b"));

    EXPECT_EQ(m_folder.read("stage"), "2");
}

}  // namespace
}  // namespace parvel::testing
