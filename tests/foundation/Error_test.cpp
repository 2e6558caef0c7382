#include "parvel/foundation/Error.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <limits>

namespace parvel::testing {
namespace {

const URL kBookURL = URL::fileURLWithPath("/library/book.epub");

void expectLibraryError(const Error& error, std::int64_t code, bool hasURL) {
    EXPECT_EQ(error.domain(), "PVParvelFoundationErrorDomain");
    EXPECT_EQ(error.code(), code);
    EXPECT_EQ(error.userInfo().size(), hasURL ? 1U : 0U);
    if (hasURL) {
        ASSERT_NE(error.url(), nullptr);
        EXPECT_EQ(*error.url(), kBookURL);
    } else {
        EXPECT_EQ(error.url(), nullptr);
    }
}

TEST(Error, ConstantsHoldTheirOwnNames) {
    EXPECT_EQ(PVParvelFoundationErrorDomain, "PVParvelFoundationErrorDomain");
    EXPECT_EQ(PVParvelFoundationUnderlyingErrorsKey, "PVParvelFoundationUnderlyingErrorsKey");
    EXPECT_EQ(PVFileErrorDomain, "PVFileErrorDomain");
    EXPECT_EQ(PVPOSIXErrorDomain, "PVPOSIXErrorDomain");
    EXPECT_EQ(PVURLErrorKey, "PVURLErrorKey");
    EXPECT_EQ(PVLocalizedFailureReasonErrorKey, "PVLocalizedFailureReasonErrorKey");
}

TEST(Error, NoAssetTypeCarriesTheURL) {
    expectLibraryError(makeNoAssetTypeError(kBookURL), -1001, /*hasURL=*/true);
}

TEST(Error, MissingURLCarriesNothing) {
    expectLibraryError(makeMissingURLError(), -1002, /*hasURL=*/false);
}

TEST(Error, NoAssetIDCarriesTheURL) {
    expectLibraryError(makeNoAssetIDError(kBookURL), -1003, /*hasURL=*/true);
}

TEST(Error, NoIdentityCarriesNothing) {
    expectLibraryError(makeNoIdentityError(), -1006, /*hasURL=*/false);
}

TEST(Error, CancelledCarriesTheSourcesURL) {
    expectLibraryError(makeCancelledError(kBookURL), -1008, /*hasURL=*/true);
}

TEST(Error, CorruptAssetCarriesTheReason) {
    const Error error = makeCorruptAssetError("PVAssetMetadata is nil");

    EXPECT_EQ(error.domain(), PVParvelFoundationErrorDomain);
    EXPECT_EQ(error.code(), -1009);
    const Error::UserInfo info{
        {"PVLocalizedFailureReasonErrorKey", std::string("PVAssetMetadata is nil")}};
    EXPECT_EQ(error.userInfo(), info);
    EXPECT_EQ(error.message(), "PVAssetMetadata is nil");
}

TEST(Error, FileErrorCarriesTheURLWhereThereIsOne) {
    const Error with = makeFileError(PVFileErrorCode::Corrupt, kBookURL);
    const Error without = makeFileError(PVFileErrorCode::Corrupt, std::nullopt);

    EXPECT_EQ(with.domain(), PVFileErrorDomain);
    EXPECT_EQ(with.code(), 259);
    ASSERT_NE(with.url(), nullptr);
    EXPECT_EQ(*with.url(), kBookURL);
    EXPECT_TRUE(without.userInfo().empty());
}

TEST(Error, POSIXErrorCarriesErrnoAndTheURL) {
    const Error error = makePOSIXError(ENODATA, kBookURL);

    EXPECT_EQ(error.domain(), PVPOSIXErrorDomain);
    EXPECT_EQ(error.code(), ENODATA);
    ASSERT_NE(error.url(), nullptr);
    EXPECT_EQ(*error.url(), kBookURL);
}

TEST(Error, ServicesReportErrnoInTheirOwnWay) {
    const struct {
        int errnoValue;
        std::string_view domain;
        std::int64_t code;
    } cases[] = {
        {ENOENT, PVFileErrorDomain, 4},     {ENOTDIR, PVFileErrorDomain, 4},
        {EEXIST, PVFileErrorDomain, 516},   {ENOTEMPTY, PVFileErrorDomain, 516},
        {EBADMSG, PVFileErrorDomain, 259},  {EACCES, PVPOSIXErrorDomain, EACCES},
        {ELOOP, PVPOSIXErrorDomain, ELOOP}, {EIO, PVPOSIXErrorDomain, EIO},
    };
    for (const auto& expected : cases) {
        const Error error = makeServiceError(expected.errnoValue, kBookURL);

        EXPECT_EQ(error.domain(), expected.domain);
        EXPECT_EQ(error.code(), expected.code);
        ASSERT_NE(error.url(), nullptr);
        EXPECT_EQ(*error.url(), kBookURL);
    }
}

TEST(Error, EveryCodeOfTheLibraryHasATextOfItsOwn) {
    std::map<std::string, std::int64_t> texts;
    for (std::int64_t code : {-1001, -1002, -1003, -1006, -1008, -1009})
        texts.emplace(Error(PVParvelFoundationErrorDomain, code).message(), code);
    for (std::int64_t code : {4, 259, 516})
        texts.emplace(Error(PVFileErrorDomain, code).message(), code);

    EXPECT_EQ(texts.size(), 9U);
    for (const auto& [text, code] : texts)
        EXPECT_FALSE(text.starts_with("Unknown error")) << code;
}

TEST(Error, POSIXCodesHaveTheCLocalesText) {
    EXPECT_EQ(makePOSIXError(ENOSPC, std::nullopt).message(), "No space left on device");
}

TEST(Error, AnUnknownCodeSaysItsNumber) {
    EXPECT_EQ(Error(PVParvelFoundationErrorDomain, -1004).message(), "Unknown error -1004");
    EXPECT_EQ(Error(PVFileErrorDomain, 5).message(), "Unknown error 5");
    EXPECT_EQ(Error(PVPOSIXErrorDomain, -1).message(), "Unknown error -1");
    EXPECT_EQ(Error(PVPOSIXErrorDomain, std::numeric_limits<std::int64_t>::max()).message(),
              "Unknown error 9223372036854775807");
    EXPECT_EQ(Error("Other", 4).message(), "Unknown error 4");
}

TEST(Error, AURLUnderAnotherKindOfEntryIsNone) {
    const Error error("D", 1, {{std::string(PVURLErrorKey), std::string("text")}});

    EXPECT_EQ(error.url(), nullptr);
}

TEST(Error, EqualsByDomainCodeAndUserInfo) {
    EXPECT_EQ(makeNoAssetIDError(kBookURL), makeNoAssetIDError(kBookURL));
    EXPECT_NE(makeNoAssetIDError(kBookURL), makeNoAssetTypeError(kBookURL));
    EXPECT_NE(makeNoAssetIDError(kBookURL), makeNoAssetIDError(URL::fileURLWithPath("/other")));
    EXPECT_NE(Error("A", 1), Error("B", 1));
}

}  // namespace
}  // namespace parvel::testing
