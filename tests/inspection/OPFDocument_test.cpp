#include "parvel/inspection/OPFDocument.h"

#include <gtest/gtest.h>

#include "tests/support/PackageDocuments.h"
#include "tests/support/RecordedLog.h"

namespace parvel::testing {
namespace {

/// An OPF document with its metadata and manifest elements.
struct ParsedOPF {
    explicit ParsedOPF(std::string_view text)
        : document(parsedXML(text)),
          opf(document->root()),
          metadata(parvel_opf_metadataElement(opf)),
          manifest(parvel_opf_manifest(opf)) {}

    std::optional<String> uniqueIdentifier(ErrorOut error = nullptr) const {
        return parvel_validatedUniqueIdentifierFromOPFNode_metadataNode_error(opf, *metadata,
                                                                              error);
    }

    std::shared_ptr<const XmlDocument> document;
    XmlNode opf;
    std::optional<XmlNode> metadata;
    std::optional<XmlNode> manifest;
};

ParsedOPF opfWithMetadata(std::string_view metadata) {
    return ParsedOPF(opfText(metadata));
}

ParsedOPF opfWithManifest(std::string_view manifest) {
    return ParsedOPF(opfText("", manifest));
}

ParsedOPF opfWithUniqueIdentifier(std::string_view id, std::string_view metadata) {
    return ParsedOPF(opfText(metadata, "", " unique-identifier=\"" + std::string(id) + "\""));
}

TEST(OPFDocument, DeclaresThePrefixesAsAPrologue) {
    EXPECT_EQ(opfDeclarations,
              "declare namespace dc=\"http://purl.org/dc/elements/1.1/\"; "
              "declare namespace o=\"http://www.idpf.org/2007/opf\"; ");
    EXPECT_EQ(containerDeclarations,
              "declare namespace c=\"urn:oasis:names:tc:opendocument:xmlns:container\"; ");
}

TEST(OPFDocument, GivesTheTextOfTheFirstOfEachField) {
    const ParsedOPF opf = opfWithMetadata(R"(
        <dc:identifier>first</dc:identifier><dc:identifier>second</dc:identifier>
        <dc:creator>Ada</dc:creator><dc:creator>Bob</dc:creator>
        <dc:title>The <x xmlns="">Whole</x> Title</dc:title><dc:title>Subtitle</dc:title>
        <dc:subject>Novel</dc:subject><dc:subject>Sea</dc:subject>
        <dc:description>About &lt;b&gt;it&lt;/b&gt;.</dc:description>)");

    EXPECT_EQ(parvel_opf_metadata_identifier(*opf.metadata), "first");
    EXPECT_EQ(parvel_opf_metadata_creator(*opf.metadata), "Ada");
    EXPECT_EQ(parvel_opf_metadata_title(*opf.metadata), "The Whole Title");
    EXPECT_EQ(parvel_opf_metadata_subject(*opf.metadata), "Novel");
    EXPECT_EQ(parvel_opf_metadata_description(*opf.metadata), "About <b>it</b>.");
}

TEST(OPFDocument, AFieldThatIsNotThereIsNoErrorAndNotLogged) {
    const ParsedOPF opf = opfWithMetadata("");
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_EQ(parvel_opf_metadata_identifier(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_producer(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_creator(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_title(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_subject(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_description(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_format(*opf.metadata, &error), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_coverId(*opf.metadata, &error), std::nullopt);

    EXPECT_EQ(error, std::nullopt);
    EXPECT_TRUE(log.lines().empty());
}

TEST(OPFDocument, AnEmptyFieldIsEmptyText) {
    EXPECT_EQ(parvel_opf_metadata_title(*opfWithMetadata("<dc:title/>").metadata), "");
}

TEST(OPFDocument, FieldsOfOtherNamespacesDoNotCount) {
    const ParsedOPF opf = opfWithMetadata(R"(<title>OPF's</title><t:title xmlns:t="x:y">x</t:title>
        <other:title xmlns:other="http://purl.org/dc/elements/1.1/">By another prefix</other:title>)");

    EXPECT_EQ(parvel_opf_metadata_title(*opf.metadata), "By another prefix");
}

TEST(OPFDocument, FieldsBelowAnotherElementDoNotCount) {
    const ParsedOPF opf = opfWithMetadata("<dc-metadata><dc:title>Nested</dc:title></dc-metadata>");

    EXPECT_EQ(parvel_opf_metadata_title(*opf.metadata), std::nullopt);
}

TEST(OPFDocument, OnlyTheContributorWithTheToolsIdIsTheProducer) {
    const ParsedOPF opf = opfWithMetadata(R"(<dc:contributor>First</dc:contributor>
        <dc:contributor id="bkp">Other</dc:contributor>
        <dc:contributor id="pvp">Folium Author 2</dc:contributor>)");

    EXPECT_EQ(parvel_opf_metadata_producer(*opf.metadata), "Folium Author 2");
}

TEST(OPFDocument, OnlyAMetaInNoNamespaceTellsTheFormat) {
    const ParsedOPF usual = opfWithMetadata("<meta property=\"folium:format\">fixed</meta>");
    const ParsedOPF bare =
        opfWithMetadata("<meta xmlns=\"\" property=\"folium:format\">fixed</meta>");

    EXPECT_EQ(parvel_opf_metadata_format(*usual.metadata), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_format(*bare.metadata), "fixed");
}

TEST(OPFDocument, WhatStandsUnderAnUndeclaredPrefixIsAnotherName) {
    const ParsedOPF opf = opfWithMetadata(R"(<u:meta property="folium:format">no</u:meta>
        <dc:contributor u:id="pvp">no</dc:contributor>
        <dc:contributor u:id="x" id="pvp">Folium Author</dc:contributor>)");

    EXPECT_EQ(parvel_opf_metadata_format(*opf.metadata), std::nullopt);
    EXPECT_EQ(parvel_opf_metadata_producer(*opf.metadata), "Folium Author");
}

TEST(OPFDocument, OnlyAMetaOfThePackageNamespaceTellsTheCover) {
    const ParsedOPF usual = opfWithMetadata("<meta name=\"cover\" content=\"img\"/>");
    const ParsedOPF bare = opfWithMetadata("<meta xmlns=\"\" name=\"cover\" content=\"img\"/>");

    EXPECT_EQ(parvel_opf_metadata_coverId(*usual.metadata), "img");
    EXPECT_EQ(parvel_opf_metadata_coverId(*bare.metadata), std::nullopt);
}

TEST(OPFDocument, ACoverMetaWithoutContentNamesNoCover) {
    EXPECT_EQ(parvel_opf_metadata_coverId(*opfWithMetadata("<meta name=\"cover\"/>").metadata),
              std::nullopt);
}

TEST(OPFDocument, TakesTheFirstMetadataAndManifestOfTheFirstPackage) {
    const ParsedOPF opf(R"(<package xmlns="http://www.idpf.org/2007/opf">
        <metadata id="a"/><metadata id="b"/><manifest id="c"/><manifest id="d"/></package>)");

    ASSERT_TRUE(opf.metadata && opf.manifest);
    EXPECT_EQ(opf.document->attribute(opf.metadata->node, "id"), "a");
    EXPECT_EQ(opf.document->attribute(opf.manifest->node, "id"), "c");
}

TEST(OPFDocument, APackageInAnotherNamespaceHasNoMetadata) {
    const ParsedOPF opf("<package><metadata/><manifest/></package>");

    EXPECT_FALSE(opf.metadata);
    EXPECT_FALSE(opf.manifest);
}

TEST(OPFDocument, FindsTheCoversHrefByItsId) {
    const ParsedOPF opf = opfWithManifest(
        R"(<item id="cover" href="no.jpg"/><item id="img" href="c.jpg"/><item id="img" href="d.jpg"/>)");

    EXPECT_EQ(parvel_opf_manifest_coverHrefWithId_error(*opf.manifest, "img"), "c.jpg");
}

TEST(OPFDocument, LooksForTheItemCoverOnlyWithoutAnId) {
    const ParsedOPF opf = opfWithManifest(R"(<item id="cover" href="c.jpg"/>)");

    EXPECT_EQ(parvel_opf_manifest_coverHrefWithId_error(*opf.manifest, std::nullopt), "c.jpg");
    EXPECT_EQ(parvel_opf_manifest_coverHrefWithId_error(*opf.manifest, ""), "c.jpg");
    EXPECT_EQ(parvel_opf_manifest_coverHrefWithId_error(*opf.manifest, "other"), std::nullopt);
}

TEST(OPFDocument, ACoverIdWithAQuoteBreaksTheExpression) {
    const ParsedOPF opf = opfWithManifest(R"(<item id="cover" href="c.jpg"/>)");
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_EQ(parvel_opf_manifest_coverHrefWithId_error(*opf.manifest, "a\"b", &error),
              std::nullopt);

    EXPECT_TRUE(error);
    EXPECT_EQ(log.lines(), std::vector<std::string>{
                               "default Failed to get element from xpath: o:item[@id=\"a\"b\"]"});
}

TEST(OPFDocument, AFailedEvaluationIsLoggedWithoutTheDeclarations) {
    const auto document = parsedXML("<a/>");
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_FALSE(parvel_elementForXPath_namespaceDeclarations_error(document->root(), "x:nowhere",
                                                                    opfDeclarations, &error));

    ASSERT_TRUE(error);
    EXPECT_EQ(error->domain(), PVFileErrorDomain);
    EXPECT_EQ(error->code(), static_cast<std::int64_t>(PVFileErrorCode::Corrupt));
    EXPECT_EQ(log.lines(),
              std::vector<std::string>{"default Failed to get element from xpath: x:nowhere"});
}

TEST(ContainerDocument, GivesTheFirstRootfilesPath) {
    const auto document = parsedXML(containerText("OPS/a.opf", "<rootfile full-path=\"b.opf\"/>"));

    EXPECT_EQ(parvel_containerxml_opfPathWithError(document->root()), "OPS/a.opf");
}

TEST(ContainerDocument, AFirstRootfileWithoutAPathGivesNone) {
    const auto document = parsedXML(
        R"(<container xmlns="urn:oasis:names:tc:opendocument:xmlns:container"><rootfiles>
           <rootfile/><rootfile full-path="b.opf"/></rootfiles></container>)");
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_EQ(parvel_containerxml_opfPathWithError(document->root(), &error), std::nullopt);

    EXPECT_EQ(error, std::nullopt);
    EXPECT_TRUE(log.lines().empty());
}

TEST(ContainerDocument, AnotherNamespaceGivesNone) {
    const auto document =
        parsedXML(R"(<container><rootfiles><rootfile full-path="b.opf"/></rootfiles></container>)");

    EXPECT_EQ(parvel_containerxml_opfPathWithError(document->root()), std::nullopt);
}

TEST(UniqueIdentifier, IsTheOneThatTheAttributeNames) {
    const ParsedOPF opf = opfWithUniqueIdentifier(
        "pub", R"(<dc:identifier>one</dc:identifier><dc:identifier id="pub">two</dc:identifier>)");
    const RecordedLog log;

    EXPECT_EQ(opf.uniqueIdentifier(), "two");

    EXPECT_EQ(log.lines(),
              std::vector<std::string>{"debug UniqueIdentifier: using EPub identifier method"});
}

TEST(UniqueIdentifier, IsTheFirstWithoutTheAttribute) {
    const ParsedOPF opf = opfWithMetadata(
        R"(<dc:identifier>one</dc:identifier><dc:identifier id="pub">two</dc:identifier>)");
    const RecordedLog log;

    EXPECT_EQ(opf.uniqueIdentifier(), "one");

    EXPECT_TRUE(log.lines().empty());
}

TEST(UniqueIdentifier, IsTheFirstWithAnEmptyAttribute) {
    EXPECT_EQ(opfWithUniqueIdentifier("", "<dc:identifier>one</dc:identifier>").uniqueIdentifier(),
              "one");
}

TEST(UniqueIdentifier, DoesNotFallBackOnceAnIdIsGiven) {
    EXPECT_EQ(
        opfWithUniqueIdentifier("pub", "<dc:identifier>one</dc:identifier>").uniqueIdentifier(),
        std::nullopt);
}

TEST(UniqueIdentifier, HasOneTo64UTF16Units) {
    const auto ofText = [](const std::string& text) {
        return opfWithMetadata("<dc:identifier>" + text + "</dc:identifier>").uniqueIdentifier();
    };
    std::string umlauts;
    std::string emoji;
    for (int i = 0; i < 64; ++i)
        umlauts += "\u00fc";
    for (int i = 0; i < 32; ++i)
        emoji += "\U0001F4D6";

    EXPECT_EQ(ofText(""), std::nullopt);
    EXPECT_EQ(ofText("x"), "x");
    EXPECT_EQ(ofText(std::string(64, 'x')), std::string(64, 'x'));
    EXPECT_EQ(ofText(std::string(65, 'x')), std::nullopt);
    EXPECT_EQ(ofText(umlauts), umlauts);
    EXPECT_EQ(ofText(umlauts + "x"), std::nullopt);
    EXPECT_EQ(ofText(emoji), emoji);
    EXPECT_EQ(ofText(emoji + "x"), std::nullopt);
}

TEST(UniqueIdentifier, RefusesSlashesAndColonsWithoutAnErrorOrALine) {
    const RecordedLog log;
    std::optional<Error> error;
    for (const std::string text : {"urn:uuid:1", "a/b", "/", ":"})
        EXPECT_FALSE(
            opfWithMetadata("<dc:identifier>" + text + "</dc:identifier>").uniqueIdentifier(&error))
            << text;

    EXPECT_EQ(error, std::nullopt);
    EXPECT_TRUE(log.lines().empty());
}

TEST(UniqueIdentifier, TakesWhatOnlyLooksLikeASlash) {
    const std::string fractionSlash = "..\u2044";

    EXPECT_EQ(
        opfWithMetadata("<dc:identifier>" + fractionSlash + "</dc:identifier>").uniqueIdentifier(),
        fractionSlash);
}

TEST(UniqueIdentifier, IsTakenAsItStandsBlanksIncluded) {
    EXPECT_EQ(opfWithMetadata("<dc:identifier> a\n b </dc:identifier>").uniqueIdentifier(),
              " a\n b ");
}

TEST(UniqueIdentifier, AnIdWithAQuoteBreaksTheExpression) {
    const ParsedOPF opf =
        opfWithUniqueIdentifier("it's", R"(<dc:identifier id="it's">one</dc:identifier>)");
    const RecordedLog log;
    std::optional<Error> error;

    EXPECT_EQ(opf.uniqueIdentifier(&error), std::nullopt);

    EXPECT_TRUE(error);
    const std::vector<std::string> expected{
        "debug UniqueIdentifier: using EPub identifier method",
        "default Failed to get element from xpath: dc:identifier[@id='it's']"};
    EXPECT_EQ(log.lines(), expected);
}

TEST(UniqueIdentifier, AnIdIsPartOfTheExpressionAsItStands) {
    const ParsedOPF opf =
        opfWithUniqueIdentifier("x' or '1'='1", R"(<dc:identifier id="a">one</dc:identifier>)");

    EXPECT_EQ(opf.uniqueIdentifier(), "one");
}

}  // namespace
}  // namespace parvel::testing
