#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/xattr.h>
#include <nlohmann/json.hpp>

#include <cerrno>
#include <ctime>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/foundation/PVParvelLog.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/corpus/CorpusBook.h"

namespace parvel::testing {
namespace {

using nlohmann::json;
using ::testing::IsEmpty;

class CorpusTest : public ::testing::TestWithParam<Expectation> {
protected:
    void SetUp() override {
        if (corpusFolder().empty())
            GTEST_SKIP() << kNoCorpus;
        m_book.emplace(GetParam());
    }

    void expectInspection(bool withCover, const json& changes = json::object()) {
        std::optional<Error> error = makeMissingURLError();  // to be overwritten in every case
        const URL url = m_book->url();
        const AssetPtr record =
            withCover
                ? PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url, &error)
                : PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &error);

        if (GetParam().isDisputed() && record) {
            EXPECT_EQ(error, std::nullopt);
            return;
        }
        if (!GetParam().hasRecord(changes.contains("PVGeneratedItemId"))) {
            EXPECT_TRUE(record == nullptr) << record->description();
            EXPECT_TRUE(error == GetParam().error(url)) << logText(error);
            return;
        }
        ASSERT_TRUE(record != nullptr) << logText(error);
        EXPECT_EQ(error, std::nullopt);
        EXPECT_EQ(record->assetType(), GetParam().type());
        EXPECT_EQ(record->url(), url);
        json expected = GetParam().record(withCover);
        expected.update(changes);
        EXPECT_THAT(differences(*record->backingDictionary(), expected, m_book->root()), IsEmpty());
    }

    std::optional<CorpusBook> m_book;
};

TEST_P(CorpusTest, IsReadWithoutCover) {
    expectInspection(/*withCover=*/false);
}

TEST_P(CorpusTest, IsReadWithCover) {
    expectInspection(/*withCover=*/true);
}

/// A day's start in the zone of this process, as metadata dates are kept to the day.
Date dayStart(int year, int month, int day) {
    std::tm time{};
    time.tm_year = year - 1900;
    time.tm_mon = month - 1;
    time.tm_mday = day;
    time.tm_isdst = -1;
    return Date{static_cast<double>(std::mktime(&time) - kReferenceDateUnixSeconds)};
}

class CorpusAttributesTest : public CorpusTest {
protected:
    void SetUp() override {
        CorpusTest::SetUp();
        if (IsSkipped())
            return;
        const auto dateText = [](const Date& date) {
            return PVAssetMetadataFileManager::stringFromMetadataDate(date);
        };
        set("assetID", "held-by-the-file");
        set("title", "Held Title");
        set("sortTitle", "title, held");
        set("author", "Held Author");
        set("sortAuthor", "author, held");
        set("genre", "Held Genre");
        set("comments", "two\nlines");
        set("bookDescription", "grüße 草枕");
        set("year", "1906");
        set("explicit", " +07");
        set("lastOpened", dateText(dayStart(2019, 3, 5)));
        set("firstOpened", dateText(dayStart(1999, 12, 31)));
        set("rating", "4 stars");
    }

    void set(const std::string& name, const std::string& value) {
        const std::string attribute = "user.com.kestrel.Folium." + name;
        if (setxattr(m_book->path().c_str(), attribute.c_str(), value.data(), value.size(), 0) == 0)
            return;
        if (errno == ENOTSUP)
            GTEST_SKIP() << "no extended attributes on this file system";
        FAIL() << attribute << ": errno " << errno;
    }

    const json m_changes = {
        {"PVGeneratedItemId", "held-by-the-file"},
        {"itemName", "Held Title"},
        {"sort-name", "title, held"},
        {"artistName", "Held Author"},
        {"sort-artist", "author, held"},
        {"genre", "Held Genre"},
        {"comments", "two\nlines"},
        {"bookDescription", "grüße 草枕"},
        {"year", "1906"},
        {"explicit", true},
        {"PVLastOpenedDate", {{"$date", isoText(dayStart(2019, 3, 5))}}},
        {"PVFirstOpenedDate", {{"$date", isoText(dayStart(1999, 12, 31))}}},
        {"rating", 4},
    };
};

TEST_P(CorpusAttributesTest, WinWithoutCover) {
    expectInspection(/*withCover=*/false, m_changes);
}

TEST_P(CorpusAttributesTest, WinWithCover) {
    expectInspection(/*withCover=*/true, m_changes);
}

std::string bookName(const ::testing::TestParamInfo<Expectation>& info) {
    return info.param.testName();
}

INSTANTIATE_TEST_SUITE_P(Book, CorpusTest, ::testing::ValuesIn(Expectation::all()), bookName);
INSTANTIATE_TEST_SUITE_P(Book, CorpusAttributesTest, ::testing::ValuesIn(Expectation::all()),
                         bookName);

}  // namespace
}  // namespace parvel::testing
