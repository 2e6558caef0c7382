#include "parvel/xattr/ExtendedAttributes.h"

#include <cerrno>
#include <functional>

#include <gtest/gtest.h>

#include "tests/support/AttributeFolder.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

using namespace std::string_literals;

constexpr std::string_view someName = "com.example.some";

std::optional<Data> dataOf(std::string_view text) {
    return Data::copyOf(text);
}

class ExtendedAttributes : public AttributeFolder {
protected:
    std::optional<Error> m_error;
};

TEST_F(ExtendedAttributes, WritesTheWholeBuffer) {
    const URL url = file();
    const Data bytes = Data::copyOf("a\0b"s);

    EXPECT_TRUE(pvamfm_setExtendedAttributeData_forKey_error(url, &bytes, someName, &m_error));

    EXPECT_EQ(stored(url, someName), "a\0b"s);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(ExtendedAttributes, WritesABufferOfSeveralRangesAsOne) {
    const URL url = file();
    const Data parts[] = {Data::copyOf("ab"), Data::copyOf("c")};
    const Data bytes = Data::joining(parts);

    EXPECT_TRUE(pvamfm_setExtendedAttributeData_forKey_error(url, &bytes, someName));

    EXPECT_EQ(stored(url, someName), "abc");
}

TEST_F(ExtendedAttributes, AnEmptyBufferMakesAnEmptyAttributeThatReadsAsEmptyBytes) {
    const URL url = file();
    const Data none;

    EXPECT_TRUE(pvamfm_setExtendedAttributeData_forKey_error(url, &none, someName));

    EXPECT_EQ(stored(url, someName), "");
    std::optional<Data> read;
    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, &read, someName));
    EXPECT_EQ(read, Data());
}

TEST_F(ExtendedAttributes, WritingReplacesTheValue) {
    const URL url = file();
    setStored(url, someName, "a longer value");

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, "new", someName));

    EXPECT_EQ(stored(url, someName), "new");
}

TEST_F(ExtendedAttributes, WritingFollowsALink) {
    const URL url = file();
    const URL link = m_folder.url("link.epub");
    std::filesystem::create_symlink(url.path(), link.path());

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(link, "text", someName));

    EXPECT_EQ(stored(url, someName), "text");
}

TEST_F(ExtendedAttributes, AFolderHasAttributesToo) {
    const URL url = m_folder.url("package.epub");
    std::filesystem::create_directory(url.path());

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, "text", someName));

    std::optional<String> read;
    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &read, someName));
    EXPECT_EQ(read, "text");
}

TEST_F(ExtendedAttributes, AFailedWriteGivesTheErrnoAndTheURL) {
    const URL url = m_folder.url("absent.epub");

    EXPECT_FALSE(pvamfm_setExtendedAttributeString_forKey_error(url, "text", someName, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENOENT, url));
}

TEST_F(ExtendedAttributes, AFailedWriteWithoutAPlaceForTheErrorIsFalseAlone) {
    EXPECT_FALSE(
        pvamfm_setExtendedAttributeString_forKey_error(m_folder.url("absent"), "text", someName));
}

TEST_F(ExtendedAttributes, AbsentBytesRemoveTheAttribute) {
    const URL url = file();
    setStored(url, someName, "value");

    EXPECT_TRUE(pvamfm_setExtendedAttributeData_forKey_error(url, nullptr, someName, &m_error));

    EXPECT_EQ(stored(url, someName), std::nullopt);
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(ExtendedAttributes, AnAbsentStringRemovesTheAttribute) {
    const URL url = file();
    setStored(url, someName, "value");

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, std::nullopt, someName));

    EXPECT_EQ(stored(url, someName), std::nullopt);
}

TEST_F(ExtendedAttributes, RemovingAnAbsentAttributeFails) {
    const URL url = file();

    EXPECT_FALSE(pvamfm_setExtendedAttributeData_forKey_error(url, nullptr, someName, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENODATA, url));
}

TEST_F(ExtendedAttributes, AStringIsStoredAsItsBytesWithoutATerminator) {
    const URL url = file();

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, "M\u00fcnchen", someName));

    std::optional<Data> read;
    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, &read, someName));
    EXPECT_EQ(read, dataOf("M\xC3\xBCnchen"));
}

TEST_F(ExtendedAttributes, AnAbsentAttributeReadsAsSuccessAndLeavesThePlaceUntouched) {
    const URL url = file();
    std::optional<Data> data = dataOf("before");
    std::optional<String> string = "before";

    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, &data, someName, &m_error));
    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &string, someName, &m_error));

    EXPECT_EQ(data, dataOf("before"));
    EXPECT_EQ(string, "before");
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(ExtendedAttributes, AFailedSizeQueryGivesItsErrorWithoutTheURL) {
    EXPECT_FALSE(pvamfm_extendedAttributeData_forKey_error(m_folder.url("absent"), nullptr,
                                                           someName, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENOENT, std::nullopt));
}

TEST_F(ExtendedAttributes, WithoutAPlaceForTheBytesOnlyAMissingOrEmptyAttributeReads) {
    const URL url = file();
    setStored(url, "com.example.empty", "");
    setStored(url, "com.example.full", "x");

    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, nullptr, someName, &m_error));
    EXPECT_TRUE(
        pvamfm_extendedAttributeData_forKey_error(url, nullptr, "com.example.empty", &m_error));
    EXPECT_FALSE(
        pvamfm_extendedAttributeData_forKey_error(url, nullptr, "com.example.full", &m_error));

    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(ExtendedAttributes, WithoutAPlaceForTheStringAnAttributeReadsAllTheSame) {
    const URL url = file();
    setStored(url, someName, "x");

    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, nullptr, someName));
}

TEST_F(ExtendedAttributes, AStringEndsAtTheFirstNUL) {
    const URL url = file();
    setStored(url, someName, "ab\0cd"s);

    std::optional<String> read;
    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &read, someName));

    EXPECT_EQ(read, "ab");
}

TEST_F(ExtendedAttributes, BytesThatAreNoUTF8ReadAsNoString) {
    const URL url = file();
    for (const std::string& bytes : {"\xFF"s, "ab\xC3"s, "\xED\xA0\xBD"s, "ab\0\xFF"s}) {
        setStored(url, someName, bytes);
        std::optional<String> read = "before";

        EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &read, someName, &m_error));

        EXPECT_EQ(read, std::nullopt);
        EXPECT_EQ(m_error, std::nullopt);
    }
}

TEST_F(ExtendedAttributes, NothingIsLogged) {
    const RecordedLog log;
    const URL url = file();

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, "x", someName));
    EXPECT_FALSE(pvamfm_extendedAttributeData_forKey_error(url, nullptr, someName));
    EXPECT_FALSE(
        pvamfm_setExtendedAttributeString_forKey_error(m_folder.url("absent"), "x", someName));

    EXPECT_TRUE(log.lines().empty());
}

TEST_F(ExtendedAttributes, AURLOfNoFileReachesNoFile) {
    const URL url = file();
    setStored(url, someName, "x");
    const std::optional<URL> remote = URL::fromString("http://example.com" + url.path());
    ASSERT_TRUE(remote);

    std::optional<String> read;
    EXPECT_FALSE(pvamfm_extendedAttributeString_forKey_error(*remote, &read, someName, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(ENOENT, std::nullopt));
    EXPECT_FALSE(pvamfm_setExtendedAttributeData_forKey_error(*remote, nullptr, someName));

    EXPECT_EQ(stored(url, someName), "x");
}

/// Changes a value between the size query and the read, as another process may.
class BetweenSizeAndRead : public ForwardingXattrStore {
public:
    explicit BetweenSizeAndRead(std::function<void()> change) : m_change(std::move(change)) {}

    int get(const std::string& path, const std::string& name, std::span<std::byte> buffer,
            std::size_t& length) override {
        m_change();
        return ForwardingXattrStore::get(path, name, buffer, length);
    }

private:
    std::function<void()> m_change;
};

TEST_F(ExtendedAttributes, AnAttributeThatVanishesInBetweenReadsAsAbsent) {
    const URL url = file();
    setStored(url, someName, "value");
    const BetweenSizeAndRead store(
        [&] { EXPECT_EQ(XattrStore::host().remove(url.path(), std::string(someName)), 0); });

    std::optional<Data> read = dataOf("before");
    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, &read, someName, &m_error));

    EXPECT_EQ(read, dataOf("before"));
    EXPECT_EQ(m_error, std::nullopt);
}

TEST_F(ExtendedAttributes, AnAttributeThatGrowsInBetweenFailsWithTheURL) {
    const URL url = file();
    setStored(url, someName, "value");
    const BetweenSizeAndRead store([&] { setStored(url, someName, "a longer value"); });

    std::optional<Data> read;
    EXPECT_FALSE(pvamfm_extendedAttributeData_forKey_error(url, &read, someName, &m_error));

    EXPECT_EQ(read, std::nullopt);
    EXPECT_EQ(m_error, makePOSIXError(ERANGE, url));
}

TEST_F(ExtendedAttributes, AnAttributeThatShrinksInBetweenKeepsTheSizeAskedFor) {
    const URL url = file();
    setStored(url, someName, "value");
    const BetweenSizeAndRead store([&] { setStored(url, someName, "va"); });

    std::optional<Data> data;
    EXPECT_TRUE(pvamfm_extendedAttributeData_forKey_error(url, &data, someName, &m_error));

    EXPECT_EQ(data, dataOf("va\0\0\0"s));
}

TEST_F(ExtendedAttributes, AFailedReadAfterTheSizeFailsEvenWithoutAPlaceForTheBytes) {
    const URL url = file();
    setStored(url, someName, "value");
    const BetweenSizeAndRead store([&] { std::filesystem::remove(url.path()); });

    EXPECT_FALSE(pvamfm_extendedAttributeData_forKey_error(url, nullptr, someName, &m_error));

    EXPECT_EQ(m_error, makePOSIXError(ENOENT, url));
}

/// A host that keeps an attribute under another name so that it travels with its file.
class DecoratingStore : public ForwardingXattrStore {
public:
    bool decorate(std::string& name) override {
        name += "#S";
        return true;
    }
};

TEST_F(ExtendedAttributes, ReadsAndWritesUseTheDecoratedNameAndRemovalThePlainOne) {
    const URL url = file();
    const DecoratingStore store;

    EXPECT_TRUE(pvamfm_setExtendedAttributeString_forKey_error(url, "text", someName));
    EXPECT_EQ(stored(url, std::string(someName) + "#S"), "text");
    std::optional<String> read;
    EXPECT_TRUE(pvamfm_extendedAttributeString_forKey_error(url, &read, someName));
    EXPECT_EQ(read, "text");

    EXPECT_FALSE(
        pvamfm_setExtendedAttributeString_forKey_error(url, std::nullopt, someName, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(ENODATA, url));
    EXPECT_EQ(stored(url, std::string(someName) + "#S"), "text");
}

/// A host that can't make the decorated name.
class UndecoratingStore : public ForwardingXattrStore {
public:
    bool decorate(std::string&) override {
        errno = ENOMEM;
        return false;
    }
};

TEST_F(ExtendedAttributes, AFailedDecorationFailsReadsAndWritesWithTheURL) {
    const URL url = file();
    const UndecoratingStore store;
    const Data bytes = Data::copyOf("x");

    EXPECT_FALSE(pvamfm_setExtendedAttributeData_forKey_error(url, &bytes, someName, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(ENOMEM, url));

    m_error.reset();
    EXPECT_FALSE(pvamfm_extendedAttributeData_forKey_error(url, nullptr, someName, &m_error));
    EXPECT_EQ(m_error, makePOSIXError(ENOMEM, url));
}

}  // namespace
}  // namespace parvel::testing
