#include "parvel/platform/XattrStore.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/xattr.h>

#include <cstring>
#include <filesystem>

#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class XattrStoreTest : public ::testing::Test {
protected:
    void SetUp() override {
        m_path = m_folder.write("a", "");
        if (set("probe", "x") == ENOTSUP)
            GTEST_SKIP() << "no extended attributes on this file system";
        ASSERT_EQ(m_store.remove(m_path, "probe"), 0);
    }
    int set(const std::string& name, std::string_view value) {
        return m_store.set(m_path, name, std::as_bytes(std::span(value)));
    }
    std::string get(const std::string& name) {
        std::string value(100, '\0');
        std::size_t length = 0;
        EXPECT_EQ(m_store.get(m_path, name, std::as_writable_bytes(std::span(value)), length), 0);
        value.resize(length);
        return value;
    }

    XattrStore& m_store = XattrStore::host();
    TemporaryDirectory m_folder;
    std::string m_path;
    std::vector<std::string> m_names;
    std::size_t m_size = 0;
};

TEST_F(XattrStoreTest, KeepsAttributesInTheUserNamespace) {
    ASSERT_EQ(set("com.kestrel.Folium.title", "Dune"), 0);

    char value[10];
    EXPECT_EQ(::getxattr(m_path.c_str(), "user.com.kestrel.Folium.title", value, sizeof value), 4);
    EXPECT_EQ(get("com.kestrel.Folium.title"), "Dune");
}

TEST_F(XattrStoreTest, ReplacesAValue) {
    ASSERT_EQ(set("a", "long value"), 0);
    ASSERT_EQ(set("a", "x"), 0);

    EXPECT_EQ(get("a"), "x");
}

TEST_F(XattrStoreTest, KeepsAnEmptyValue) {
    ASSERT_EQ(set("a", ""), 0);

    EXPECT_EQ(m_store.size(m_path, "a", m_size), 0);
    EXPECT_EQ(m_size, 0U);
    EXPECT_EQ(get("a"), "");
}

TEST_F(XattrStoreTest, GivesTheSizeOfAPresentValue) {
    ASSERT_EQ(set("a", std::string(300, 'x')), 0);

    EXPECT_EQ(m_store.size(m_path, "a", m_size), 0);
    EXPECT_EQ(m_size, 300U);
}

TEST_F(XattrStoreTest, AMissingAttributeIsENODATA) {
    std::byte value[1];
    EXPECT_EQ(m_store.size(m_path, "a", m_size), ENODATA);
    EXPECT_EQ(m_store.get(m_path, "a", value, m_size), ENODATA);
    EXPECT_EQ(m_store.remove(m_path, "a"), ENODATA);
}

TEST_F(XattrStoreTest, AMissingFileIsENOENT) {
    const std::string path = m_folder / "none";
    EXPECT_EQ(m_store.size(path, "a", m_size), ENOENT);
    EXPECT_EQ(m_store.set(path, "a", {}), ENOENT);
    EXPECT_EQ(m_store.remove(path, "a"), ENOENT);
    EXPECT_EQ(m_store.list(path, m_names), ENOENT);
}

TEST_F(XattrStoreTest, AValueLongerThanTheBufferIsERANGE) {
    ASSERT_EQ(set("a", "four"), 0);

    std::byte value[3];
    EXPECT_EQ(m_store.get(m_path, "a", value, m_size), ERANGE);
    EXPECT_EQ(m_store.get(m_path, "a", {}, m_size), ERANGE);
}

TEST_F(XattrStoreTest, RemovesAnAttribute) {
    ASSERT_EQ(set("a", "x"), 0);

    EXPECT_EQ(m_store.remove(m_path, "a"), 0);
    EXPECT_EQ(m_store.size(m_path, "a", m_size), ENODATA);
}

TEST_F(XattrStoreTest, FollowsLinks) {
    std::filesystem::create_symlink("a", m_folder / "link");

    ASSERT_EQ(m_store.set(m_folder / "link", "title", {}), 0);
    EXPECT_EQ(m_store.size(m_path, "title", m_size), 0);
}

TEST_F(XattrStoreTest, ServesFoldersToo) {
    ASSERT_EQ(m_store.set(m_folder / "", "title", {}), 0);

    EXPECT_EQ(m_store.list(m_folder / "", m_names), 0);
    EXPECT_THAT(m_names, ElementsAre("title"));
}

TEST_F(XattrStoreTest, ListsNoNamesOfAFileWithoutAttributes) {
    m_names = {"old"};

    EXPECT_EQ(m_store.list(m_path, m_names), 0);
    EXPECT_THAT(m_names, IsEmpty());
}

TEST_F(XattrStoreTest, ListsTheNamesOfTheUserNamespaceAlone) {
    ASSERT_EQ(set("title", "x"), 0);
    if (::setxattr(m_path.c_str(), "trusted.parvel", "x", 1, 0) != 0)
        GTEST_SKIP() << "no right to set a trusted attribute";

    EXPECT_EQ(m_store.list(m_path, m_names), 0);
    EXPECT_THAT(m_names, ElementsAre("title"));
}

TEST_F(XattrStoreTest, ListsMoreNamesThanOneCallTakes) {
    for (int i = 0; i < 20; ++i)
        ASSERT_EQ(set(std::string(100, 'n') + std::to_string(i), ""), 0);

    EXPECT_EQ(m_store.list(m_path, m_names), 0);
    EXPECT_THAT(m_names, SizeIs(20));
}

TEST_F(XattrStoreTest, ListsNothingWhereNoAttributesAreKept) {
    std::size_t size = 0;
    if (m_store.size("/proc/self/status", "title", size) != ENOTSUP)
        GTEST_SKIP() << "/proc answers otherwise here";

    EXPECT_EQ(m_store.list("/proc/self/status", m_names), 0);
    EXPECT_TRUE(m_names.empty());
}

TEST_F(XattrStoreTest, DecorationKeepsTheName) {
    std::string name = "com.kestrel.Folium.title";

    EXPECT_TRUE(m_store.decorate(name));
    EXPECT_EQ(name, "com.kestrel.Folium.title");
}

TEST_F(XattrStoreTest, ANameWithANULCannotBeMade) {
    std::string name("a\0b", 3);

    errno = 0;
    EXPECT_FALSE(m_store.decorate(name));
    EXPECT_EQ(errno, EINVAL);
    EXPECT_EQ(set(name, "x"), EINVAL);
    EXPECT_EQ(m_store.remove(m_path, name), EINVAL);
}

TEST_F(XattrStoreTest, ATooLongNameIsERANGEAsTheKernelSays) {
    EXPECT_EQ(set(std::string(250, 'n'), ""), 0);
    EXPECT_EQ(set(std::string(251, 'n'), ""), ERANGE);
}

}  // namespace
}  // namespace parvel::testing
