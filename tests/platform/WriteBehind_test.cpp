#include "parvel/platform/linux/WriteBehind.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t leftToLastSync = 8 << 20;

class FilesBehind : public ::testing::Test {
protected:
    /// How many files the tree still waits for.
    std::size_t waitedFor() {
        std::size_t count = 0;
        for (; !m_tree.isEmpty(); ++count)
            EXPECT_EQ(m_tree.awaitOldest(), 0);
        return count;
    }

    TemporaryDirectory m_folder;
    host::FileDescriptor m_file{
        ::open(m_folder.write("file", "content").c_str(), O_RDWR | O_CLOEXEC)};
    host::TreeBehind m_tree;
};

TEST_F(FilesBehind, TheFirstMegabytesAreLeftToTheLastSync) {
    EXPECT_EQ(m_tree.add(m_file.get(), leftToLastSync - 1), 0);
    EXPECT_EQ(m_tree.add(m_file.get(), 1), 0);

    EXPECT_TRUE(m_tree.isEmpty());
}

TEST_F(FilesBehind, WhatComesThenIsWaitedFor) {
    ASSERT_EQ(m_tree.add(m_file.get(), leftToLastSync), 0);

    EXPECT_EQ(m_tree.add(m_file.get(), 1), 0);

    EXPECT_EQ(waitedFor(), 1U);
}

TEST_F(FilesBehind, AFileIsWaitedForAlsoWhenItIsClosed) {
    ASSERT_EQ(m_tree.add(m_file.get(), leftToLastSync), 0);
    ASSERT_EQ(m_tree.add(m_file.get(), 1), 0);

    EXPECT_EQ(m_file.close(), 0);

    EXPECT_EQ(waitedFor(), 1U);
}

TEST_F(FilesBehind, NoMoreThanAFewMegabytesAreBehind) {
    for (int count = 0; count < 10; ++count)
        ASSERT_EQ(m_tree.add(m_file.get(), leftToLastSync), 0);

    EXPECT_EQ(waitedFor(), 1U);
}

TEST_F(FilesBehind, NoMoreThanAFewFilesAreBehind) {
    ASSERT_EQ(m_tree.add(m_file.get(), leftToLastSync), 0);
    for (int count = 0; count < 1000; ++count)
        ASSERT_EQ(m_tree.add(m_file.get(), 1), 0);

    EXPECT_LE(waitedFor(), 32U);
}

TEST_F(FilesBehind, AFileThatCanNotBeKeptOpenIsLeftToTheLastSync) {
    ASSERT_EQ(m_tree.add(m_file.get(), leftToLastSync), 0);

    EXPECT_EQ(m_tree.add(-1, 1), 0);

    EXPECT_TRUE(m_tree.isEmpty());
}

}  // namespace
}  // namespace parvel::testing
