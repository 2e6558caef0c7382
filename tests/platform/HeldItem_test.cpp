#include "parvel/platform/HeldItem.h"

#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <optional>
#include <thread>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/FileReader.h"
#include "parvel/platform/PdfDocument.h"
#include "parvel/platform/ResourceQueries.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/ZipArchive.h"
#include "tests/support/AttributeFolder.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ForwardingXattrStore.h"
#include "tests/support/PdfBuilder.h"

namespace parvel::testing {
namespace {

constexpr std::uint64_t plenty = 1 << 20;

class HeldItemTest : public AttributeFolder {
protected:
    /// A book whose title, member "mark" and attribute "mark" are the text.
    URL bookSaying(const std::string& text, std::string_view name) const {
        const URL url = EpubBuilder()
                            .opf(opfText("<dc:title>" + text + "</dc:title>"))
                            .file("mark", text)
                            .zip(m_folder / name);
        setStored(url, "mark", text);
        return url;
    }
    URL packageSaying(const std::string& text, std::string_view name) const {
        return EpubBuilder().file("mark", text).expand(m_folder / name);
    }

    static std::optional<Data> entryOf(const URL& url) {
        const auto archive = ZipReader::host().open(url);
        return archive ? archive->readEntry("mark", plenty) : std::nullopt;
    }
    static std::optional<Data> memberOf(const URL& url) {
        return FileReader::host().readMember(url, "mark", plenty);
    }
};

TEST_F(HeldItemTest, AnswersStayAboutTheHeldFileThoughAnotherTakesItsName) {
    const URL url = bookSaying("first", "book.epub");
    const URL other = bookSaying("second", "other.epub");
    {
        const HeldItem held(url);
        std::filesystem::rename(other.path(), url.path());

        EXPECT_EQ(stored(url, "mark"), "first");
        EXPECT_EQ(entryOf(url), Data::copyOf("first"));
    }
    EXPECT_EQ(stored(url, "mark"), "second");
    EXPECT_EQ(entryOf(url), Data::copyOf("second"));
}

TEST_F(HeldItemTest, ADocumentIsTheHeldFilesOwn) {
    m_folder.write("a.pdf", PdfBuilder{}.information("/Author (first)").page("").bytes());
    const URL url = m_folder.url("a.pdf");
    const HeldItem held(url);
    std::filesystem::remove(url.path());
    m_folder.write("a.pdf", PdfBuilder{}.information("/Author (second)").page("").bytes());

    EXPECT_EQ(PdfDocuments::host().open(url)->author(), "first");
}

TEST_F(HeldItemTest, TheListIsTheHeldFilesOwn) {
    const URL url = file();
    setStored(url, "mark", "");
    const HeldItem held(url);
    std::filesystem::remove(url.path());
    file();

    std::vector<std::string> names;
    EXPECT_EQ(XattrStore::host().list(url.path(), names), 0);
    EXPECT_EQ(names, std::vector<std::string>{"mark"});
}

TEST_F(HeldItemTest, AHeldFileStaysReachableWithoutItsName) {
    const URL url = file();
    const HeldItem held(url);
    std::filesystem::remove(url.path());

    EXPECT_TRUE(ResourceQueries::host().isReachable(url));
    EXPECT_EQ(ResourceQueries::host().isDirectory(url), false);
}

TEST_F(HeldItemTest, MembersAreReadFromTheHeldFolder) {
    const URL url = packageSaying("first", "book.epub");
    const URL other = packageSaying("second", "other.epub");
    {
        const HeldItem held(url);
        std::filesystem::rename(url.path(), m_folder / "away");
        std::filesystem::rename(other.path(), url.path());

        EXPECT_EQ(memberOf(url), Data::copyOf("first"));
    }
    EXPECT_EQ(memberOf(url), Data::copyOf("second"));
}

TEST_F(HeldItemTest, AMemberOfAHeldFileIsMissing) {
    const URL url = file();
    const HeldItem held(url);

    std::optional<Error> error;
    EXPECT_FALSE(FileReader::host().readMember(url, "mark", plenty, &error));
    ASSERT_TRUE(error);
    EXPECT_EQ(error->domain(), PVFileErrorDomain);
    EXPECT_EQ(error->code(), 4);
    ASSERT_TRUE(error->url());
    EXPECT_EQ(*error->url(), url.appendingPathComponent("mark"));
}

TEST_F(HeldItemTest, OtherPathsAreLookedUp) {
    const URL url = bookSaying("first", "book.epub");
    const URL other = bookSaying("second", "other.epub");
    const HeldItem held(url);

    EXPECT_EQ(stored(other, "mark"), "second");
    EXPECT_EQ(entryOf(other), Data::copyOf("second"));
}

TEST_F(HeldItemTest, AScopeWithinAnotherOfItsPathHoldsTheSameFile) {
    const URL url = bookSaying("first", "book.epub");
    const HeldItem outer(url);
    std::filesystem::remove(url.path());
    bookSaying("second", "book.epub");
    const HeldItem inner(url);

    EXPECT_EQ(entryOf(url), Data::copyOf("first"));
}

TEST_F(HeldItemTest, ScopesOfTwoPathsHoldTwoFiles) {
    const URL url = bookSaying("first", "book.epub");
    const URL other = bookSaying("second", "other.epub");
    const HeldItem outer(url);
    std::filesystem::remove(url.path());
    {
        const HeldItem inner(other);
        std::filesystem::remove(other.path());
        EXPECT_EQ(entryOf(other), Data::copyOf("second"));
        EXPECT_EQ(entryOf(url), Data::copyOf("first"));
    }
    EXPECT_EQ(entryOf(url), Data::copyOf("first"));
    EXPECT_EQ(entryOf(other), std::nullopt);
}

TEST_F(HeldItemTest, OtherThreadsLookThePathUp) {
    const URL url = bookSaying("first", "book.epub");
    const HeldItem held(url);
    std::filesystem::remove(url.path());
    bookSaying("second", "book.epub");

    std::optional<Data> seen;
    std::thread([&] { seen = entryOf(url); }).join();
    EXPECT_EQ(seen, Data::copyOf("second"));
}

TEST_F(HeldItemTest, WhatCantBeOpenedIsNotHeld) {
    const URL url = m_folder.url("book.epub");
    const HeldItem held(url);
    EXPECT_FALSE(ResourceQueries::host().isReachable(url));

    bookSaying("first", "book.epub");
    EXPECT_TRUE(ResourceQueries::host().isReachable(url));
    EXPECT_EQ(entryOf(url), Data::copyOf("first"));
}

TEST_F(HeldItemTest, AnArchiveOutlivesTheScope) {
    const URL url = bookSaying("first", "book.epub");
    std::unique_ptr<ZipArchive> archive;
    {
        const HeldItem held(url);
        archive = ZipReader::host().open(url);
    }
    ASSERT_TRUE(archive);
    EXPECT_EQ(archive->readEntry("mark", plenty), Data::copyOf("first"));
}

TEST_F(HeldItemTest, AFIFOWithoutAWriterIsNotWaitedFor) {
    const URL url = m_folder.url("book.epub");
    ASSERT_EQ(mkfifo(url.path().c_str(), 0600), 0);

    const HeldItem held(url);
    std::optional<Error> error;
    EXPECT_FALSE(ZipReader::host().open(url, &error));
    ASSERT_TRUE(error);
    EXPECT_EQ(error->code(), 259);
}

/// Puts another book at the path once the attributes have been listed.
class ReplacingXattrStore : public ForwardingXattrStore {
public:
    ReplacingXattrStore(std::string from, std::string to)
        : m_from(std::move(from)), m_to(std::move(to)) {}

    int list(const std::string& path, std::vector<std::string>& names) override {
        const int errnoValue = ForwardingXattrStore::list(path, names);
        std::filesystem::rename(m_from, m_to);
        return errnoValue;
    }

private:
    std::string m_from;
    std::string m_to;
};

TEST_F(HeldItemTest, ARecordIsOfOneFileThoughAnotherTakesItsNameMeanwhile) {
    const URL url = bookSaying("first", "book.epub");
    setStored(url, "com.kestrel.Folium.genre", "first's genre");
    const URL other = bookSaying("second", "other.epub");
    const ReplacingXattrStore store(other.path(), url.path());

    const AssetPtr record = PVAssetMetadataInspector::metadataForAssetAtURL_error(url);
    ASSERT_TRUE(record);
    EXPECT_EQ(record->title(), "first");
    ASSERT_TRUE(record->genre());
    EXPECT_EQ(*record->genre(), Value("first's genre"));
    EXPECT_EQ(entryOf(url), Data::copyOf("second"));
}

/// Puts another book at the path once an archive has been opened.
class ReplacingZipReader : public ZipReader {
public:
    ReplacingZipReader(std::string from, std::string to)
        : m_from(std::move(from)), m_to(std::move(to)) {}

    std::unique_ptr<ZipArchive> open(const URL& url, ErrorOut error) override {
        auto archive = host().open(url, error);
        std::error_code isThereAlready;
        std::filesystem::rename(m_from, m_to, isThereAlready);
        return archive;
    }

private:
    std::string m_from;
    std::string m_to;
    Service<ZipReader>::Replacement m_replacement{*this};
};

TEST_F(HeldItemTest, ACoverIsOfTheFileWhoseArtworkWasSought) {
    const auto bookWithCover = [&](std::string_view name, std::string_view cover) {
        return EpubBuilder()
            .opf(opfText(R"(<meta name="cover" content="c"/>)",
                         R"(<item id="c" href="c.png" media-type="image/png"/>)"))
            .file("OPS/c.png", cover)
            .zip(m_folder / name);
    };
    const URL url = bookWithCover("book.epub", "first");
    const URL other = bookWithCover("other.epub", "second");
    ReplacingZipReader reader(other.path(), url.path());

    EXPECT_EQ(PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(url),
              Data::copyOf("first"));
    EXPECT_FALSE(std::filesystem::exists(other.path()));
}

}  // namespace
}  // namespace parvel::testing
