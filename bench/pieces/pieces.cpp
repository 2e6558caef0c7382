// The small pieces that an inspection is made of, each by itself.

#include <benchmark/benchmark.h>
#include <unistd.h>
#include <zip.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "parvel/foundation/PVDigest.h"
#include "parvel/inspection/OPFDocument.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"
#include "parvel/platform/PropertyList.h"
#include "parvel/platform/ZipArchive.h"

namespace parvel::bench {
namespace {

constexpr std::uint64_t kLimit = 1 << 20;
constexpr std::string_view kWanted = "META-INF/container.xml";

const URL& anyURL() {
    static const URL url = URL::fileURLWithPath("/books/A.epub");
    return url;
}

/// A package document with so many items in its manifest.
std::string packageDocument(std::int64_t items) {
    std::string text =
        R"(<?xml version="1.0"?><package xmlns="http://www.idpf.org/2007/opf" version="2.0")"
        R"( unique-identifier="id"><metadata xmlns:dc="http://purl.org/dc/elements/1.1/">)"
        R"(<dc:identifier id="id">urn-1234</dc:identifier><dc:title>A Title</dc:title>)"
        R"(<dc:creator>An Author</dc:creator><dc:subject>Fiction</dc:subject>)"
        R"(<dc:description>What it tells.</dc:description><meta name="cover" content="i1"/>)"
        R"(</metadata><manifest>)";
    for (std::int64_t i = 0; i < items; ++i)
        text += R"(<item id="i)" + std::to_string(i) + R"(" href="text/chapter-)" +
                std::to_string(i) + R"(.xhtml" media-type="application/xhtml+xml"/>)";
    return text + "</manifest></package>";
}

/// A zip file of so many entries, gone with its owner.
class ArchiveFile {
public:
    explicit ArchiveFile(std::int64_t entries) {
        m_path = (std::filesystem::temp_directory_path() / "parvel-bench-XXXXXX").string();
        close(mkstemp(m_path.data()));
        zip_t* archive = zip_open(m_path.c_str(), ZIP_TRUNCATE, nullptr);
        static const std::string content = packageDocument(10);
        for (std::int64_t i = 0; i < entries; ++i) {
            const std::string name =
                i == entries / 2 ? std::string(kWanted) : "OPS/" + std::to_string(i) + ".xhtml";
            zip_file_add(archive, name.c_str(),
                         zip_source_buffer(archive, content.data(), content.size(), 0), 0);
        }
        zip_close(archive);
    }
    ~ArchiveFile() { std::filesystem::remove(m_path); }
    ArchiveFile(const ArchiveFile&) = delete;
    ArchiveFile& operator=(const ArchiveFile&) = delete;

    [[nodiscard]] URL url() const { return URL::fileURLWithPath(m_path); }

private:
    std::string m_path;
};

void zipEntryByName(benchmark::State& state) {
    const ArchiveFile file(state.range(0));
    for (auto _ : state) {
        const auto archive = ZipReader::host().open(file.url());
        benchmark::DoNotOptimize(archive->readEntry(kWanted, kLimit));
    }
}
BENCHMARK(zipEntryByName)->Arg(20)->Arg(3000);

void packageDocumentParsed(benchmark::State& state) {
    const Data document = Data::copyOf(packageDocument(state.range(0)));
    for (auto _ : state)
        benchmark::DoNotOptimize(XmlParser::host().parse(document, anyURL()));
}
BENCHMARK(packageDocumentParsed)->Arg(20)->Arg(500);

void packageDocumentAsked(benchmark::State& state) {
    const auto document =
        XmlParser::host().parse(Data::copyOf(packageDocument(state.range(0))), anyURL());
    for (auto _ : state) {
        const auto metadata = parvel_opf_metadataElement(document->root());
        benchmark::DoNotOptimize(parvel_opf_metadata_title(*metadata));
        benchmark::DoNotOptimize(parvel_opf_metadata_creator(*metadata));
        benchmark::DoNotOptimize(parvel_validatedUniqueIdentifierFromOPFNode_metadataNode_error(
            document->root(), *metadata));
        benchmark::DoNotOptimize(parvel_opf_manifest_coverHrefWithId_error(
            *parvel_opf_manifest(document->root()), parvel_opf_metadata_coverId(*metadata)));
    }
}
BENCHMARK(packageDocumentAsked)->Arg(20)->Arg(500);

void md5OfBytes(benchmark::State& state) {
    const Data bytes = Data::copyOf(std::string(static_cast<std::size_t>(state.range(0)), 'x'));
    for (auto _ : state)
        benchmark::DoNotOptimize(parvel_MD5String(bytes));
    state.SetBytesProcessed(state.iterations() * state.range(0));
}
BENCHMARK(md5OfBytes)->Arg(4 << 10)->Arg(1 << 20);

Dictionary storeMetadata() {
    Dictionary dictionary;
    for (const std::string_view name :
         {key::itemName, key::artistName, key::genre, key::assetDescription, key::sortTitle,
          key::sortAuthor, key::comments, key::year, key::versionNumber})
        dictionary.set(name, String("A text of some words"));
    dictionary.set(key::storeID, Number::signedInteger(900'000'001));
    dictionary.set(key::isPreview, Number::boolean(false));
    dictionary.set(key::releaseDate, Date{700'000'000});
    return dictionary;
}

void propertyListRead(benchmark::State& state) {
    const Data list = *PropertyListCodec::host().writeXML(storeMetadata());
    for (auto _ : state)
        benchmark::DoNotOptimize(PropertyListCodec::host().parse(list, std::nullopt));
}
BENCHMARK(propertyListRead);

void propertyListWritten(benchmark::State& state) {
    const Value list = storeMetadata();
    for (auto _ : state)
        benchmark::DoNotOptimize(PropertyListCodec::host().writeXML(list));
}
BENCHMARK(propertyListWritten);

void recordFromDictionary(benchmark::State& state) {
    const Dictionary dictionary = storeMetadata();
    for (auto _ : state)
        benchmark::DoNotOptimize(
            PVAssetMetadata::metadataWithURL_dictionary(anyURL(), &dictionary));
}
BENCHMARK(recordFromDictionary);

void recordChanged(benchmark::State& state) {
    const Dictionary dictionary = storeMetadata();
    const AssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(anyURL(), &dictionary);
    for (auto _ : state) {
        benchmark::DoNotOptimize(record->copyWithUpdates(
            [](PVMutableAssetMetadata& copy) { copy.setTitle("Another title"); }));
    }
}
BENCHMARK(recordChanged);

void recordMerged(benchmark::State& state) {
    const Dictionary dictionary = storeMetadata();
    const AssetPtr other = PVAssetMetadata::metadataWithURL_dictionary(anyURL(), &dictionary);
    const AssetPtr record = PVAssetMetadata::metadataWithURL_dictionary(anyURL(), nullptr);
    for (auto _ : state) {
        benchmark::DoNotOptimize(record->copyWithUpdates(
            [&other](PVMutableAssetMetadata& copy) { copy.combineWithMetadata(other.get()); }));
    }
}
BENCHMARK(recordMerged);

}  // namespace
}  // namespace parvel::bench
