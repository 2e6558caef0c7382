#include "parvel/inspection/BestCover.h"

#include <algorithm>
#include <array>
#include <string>
#include <string_view>
#include <vector>

#include "parvel/inspection/BookMembers.h"
#include "parvel/inspection/OPFDocument.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/metadata/PVAssetMetadata.h"
#include "parvel/platform/Service.h"
#include "parvel/platform/XmlDocument.h"

namespace parvel {

namespace {

/// Further in, a picture is no likely cover.
constexpr int mostPages = 100;
constexpr int mostImagesOfPage = 8;

bool isImage(const Data& bytes) {
    using namespace std::string_view_literals;
    std::vector<std::uint8_t> storage;
    const std::string_view text = bytes.text(storage);
    return text.starts_with("\x89PNG\r\n\x1A\n"sv) || text.starts_with("\xFF\xD8\xFF"sv) ||
           text.starts_with("GIF8"sv) ||
           (text.starts_with("RIFF"sv) &&
            text.substr(std::min<std::size_t>(8, text.size())).starts_with("WEBP"sv));
}

std::optional<String> textAt(const XmlDocument& document, const std::string& expression) {
    const std::optional<XmlNode> node = parvel_elementForXPath_namespaceDeclarations_error(
        document.root(), expression, opfDeclarations);
    return node ? std::optional(document.stringValue(node->node)) : std::nullopt;
}

/// One search in one book.
class CoverSearch {
public:
    explicit CoverSearch(const URL& book) : m_members(book) {}

    [[nodiscard]] std::optional<BestCover> run();

private:
    [[nodiscard]] std::optional<BestCover> byReference(CoverRule rule,
                                                       const std::string& expression);
    [[nodiscard]] std::optional<BestCover> inSpine();
    [[nodiscard]] std::optional<BestCover> at(CoverRule rule, const std::string& member);
    [[nodiscard]] std::optional<BestCover> onPage(CoverRule rule, const XmlDocument& page,
                                                  const std::string& member);

    BookMembers m_members;
    std::string m_opfPath;
    std::shared_ptr<const XmlDocument> m_opf;
};

std::optional<BestCover> CoverSearch::run() {
    const auto container = m_members.parse(PVAssetMetadataContainerXMLPath);
    m_opfPath =
        container ? parvel_containerxml_opfPathWithError(container->root()).value_or("") : "";
    m_opf = m_members.parse(m_opfPath);
    if (!m_opf)
        return std::nullopt;

    struct Reference {
        CoverRule rule;
        const char* expression;
    };
    static constexpr std::array references{
        Reference{CoverRule::ImageProperty,
                  "/o:package/o:manifest/o:item[contains(concat(' ', normalize-space(@properties), "
                  "' '), ' cover-image ')]/@href"},
        Reference{CoverRule::Guide,
                  "/o:package/o:guide/o:reference[translate(@type, 'COVER', 'cover')='cover']/"
                  "@href"},
        Reference{CoverRule::CoverItem,
                  "/o:package/o:manifest/o:item[@id=/o:package/o:metadata/o:meta[@name='cover']/"
                  "@content]/@href"},
        Reference{CoverRule::CoverItem, "/o:package/o:manifest/o:item[@id='cover']/@href"},
    };
    for (const Reference& reference : references) {
        if (auto cover = byReference(reference.rule, reference.expression))
            return cover;
    }
    return inSpine();
}

std::optional<BestCover> CoverSearch::byReference(CoverRule rule, const std::string& expression) {
    const std::optional<String> reference = textAt(*m_opf, expression);
    return reference ? at(rule, memberForReference(*reference, m_opfPath)) : std::nullopt;
}

std::optional<BestCover> CoverSearch::inSpine() {
    for (int i = 1; i <= mostPages && !m_members.isExhausted(); ++i) {
        const std::string id = "/o:package/o:spine/o:itemref[" + std::to_string(i) + "]/@idref";
        if (!textAt(*m_opf, id))
            break;
        if (auto cover = byReference(CoverRule::FirstImage,
                                     "/o:package/o:manifest/o:item[@id=" + id + "]/@href"))
            return cover;
    }
    return std::nullopt;
}

std::optional<BestCover> CoverSearch::at(CoverRule rule, const std::string& member) {
    std::optional<Data> bytes = m_members.read(member);
    if (!bytes)
        return std::nullopt;
    if (isImage(*bytes))
        return BestCover{std::move(*bytes), rule, member, {}};
    const auto page =
        Service<XmlParser>::current().parse(*bytes, URL::fileURLWithPath("/" + member));
    return page ? onPage(rule, *page, member) : std::nullopt;
}

std::optional<BestCover> CoverSearch::onPage(CoverRule rule, const XmlDocument& page,
                                             const std::string& member) {
    static const std::string images =
        "(//*[local-name()='img']/@src | //*[local-name()='image']/@*[local-name()='href'])";
    for (int i = 1; i <= mostImagesOfPage && !m_members.isExhausted(); ++i) {
        const std::optional<String> reference =
            textAt(page, images + "[" + std::to_string(i) + "]");
        if (!reference)
            break;
        std::string image = memberForReference(*reference, member);
        std::optional<Data> bytes = m_members.read(image);
        if (bytes && isImage(*bytes))
            return BestCover{std::move(*bytes), rule, std::move(image), member};
    }
    return std::nullopt;
}

}  // namespace

std::optional<BestCover> bestCoverForAssetAtURL(const std::optional<URL>& url, ErrorOut error) {
    std::optional<Error> failure;
    std::optional<Data> own =
        PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(url, &failure);
    if (PVAssetMetadata::isBookURL(url) && !(own && isImage(*own))) {
        if (auto cover = CoverSearch(*url).run())
            return cover;
    }
    if (own)
        return BestCover{std::move(*own), CoverRule::OwnImage, {}, {}};
    assign(error, std::move(failure));
    return std::nullopt;
}

}  // namespace parvel
