#include <charconv>
#include <cstring>
#include <filesystem>

#include <unistd.h>

#include "cli/CallLog.h"
#include "cli/Command.h"
#include "cli/Messages.h"
#include "cli/Output.h"
#include "cli/OutputFile.h"
#include "cli/OutputOptions.h"
#include "cli/ResultFormat.h"
#include "parvel/foundation/ImageFiles.h"
#include "parvel/foundation/ImageScaling.h"
#include "parvel/inspection/BestCover.h"
#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "parvel/platform/ReaderProgram.h"

namespace parvel::cli {
namespace {

struct Box {
    std::uint32_t width = 0;
    std::uint32_t height = 0;
};

/// "WxH". Throws UsageError.
Box boxOfText(const std::string& text) {
    constexpr std::uint32_t longestSide = 65'535;
    Box box;
    const char* end = text.data() + text.size();
    const auto width = std::from_chars(text.data(), end, box.width);
    const bool isSeparated = width.ec == std::errc() && width.ptr != end && *width.ptr == 'x';
    const auto height = std::from_chars(isSeparated ? width.ptr + 1 : end, end, box.height);
    const bool isBox = isSeparated && height.ec == std::errc() && height.ptr == end &&
                       box.width >= 1 && box.height >= 1 && box.width <= longestSide &&
                       box.height <= longestSide;
    if (!isBox)
        throw UsageError("--size " + text + ": not two numbers of pixels, as 300x400");
    return box;
}

std::string_view wordsFor(CoverRule rule) {
    switch (rule) {
        case CoverRule::OwnImage:
            return "the book's own cover";
        case CoverRule::ImageProperty:
            return "the item that is marked as the cover image";
        case CoverRule::Guide:
            return "the guide's cover";
        case CoverRule::CoverItem:
            return "the cover item";
        case CoverRule::FirstImage:
            return "the first image of the text";
    }
    return {};
}

bool hasCover(const Result& result) {
    return PVAssetMetadataInspector::coverImageDataForAssetAtURL_error(urlOfPath(result.path))
        .has_value();
}

std::string reasonAgainstDecoding() {
    if (!readerConfinement())
        return "images can't be decoded: parvel-reader can't be started";
    return "what it has for one is no PNG, JPEG, GIF or WebP image, or a damaged or too large one";
}

bool isBook(const Result& result) {
    return result.assetType == PVAssetTypeEPub || result.assetType == PVAssetTypeKestrelPub;
}

bool isSameFile(const std::string& path, const std::string& other) {
    std::error_code ignored;
    return std::filesystem::equivalent(path, other, ignored);
}

class CoverCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    [[nodiscard]] std::optional<Data> coverFor(Result& result) const;
    [[nodiscard]] std::optional<Data> bestFor(Result& result) const;
    [[nodiscard]] std::optional<Data> scaled(const std::optional<Image>& image,
                                             Result& result) const;
    [[nodiscard]] bool deliver(Result& result, const std::optional<Data>& cover) const;
    [[nodiscard]] bool store(Result& result, std::string_view bytes) const;
    /// "-" is standard output.
    [[nodiscard]] bool hasFile() const { return m_file && *m_file != "-"; }

    std::optional<std::string> m_file;
    std::optional<std::string> m_size;
    bool m_best = false;
    OutputOptions m_output;

    std::optional<Box> m_box;
};

void CoverCommand::declare(CommandLine& line) {
    line.group("What is given");
    line.option("-o,--output", "FILE", "write the image to FILE, in place of standard output",
                m_file);
    line.option("--size", "WxH", "scale the image to fit W by H pixels, as PNG", m_size);
    line.flag("--best",
              "where a book names no image as its cover, go on looking:\n"
              "its guide, its cover page, its first image",
              m_best);
    m_output.declare(line);
}

int CoverCommand::run(std::vector<std::string> operands) {
    m_output.applyLog();
    if (operands.size() != 1)
        throw UsageError("one PATH is needed");
    if (m_size)
        m_box = boxOfText(*m_size);
    if (m_output.form() == OutputForm::Text && !m_file && isatty(STDOUT_FILENO) == 1)
        throw UsageError(
            "an image is nothing for a terminal: give -o FILE, or send the output elsewhere");
    if (hasFile() && isSameFile(*m_file, operands[0]))
        throw UsageError("-o " + *m_file + ": that is the asset itself");
    if (hasFile() &&
        PVAssetMetadata::assetTypeForAssetAtURL(urlOfOption("-o", *m_file)) != PVAssetTypeUnknown)
        throw UsageError("-o " + *m_file + ": that is the name of an asset");

    Result result = resultForPath(operands[0]);
    result.nothing = "no cover image";
    CallLog log;
    const std::optional<Data> cover = coverFor(result);
    if (!cover || result.error) {
        if (result.reason.empty())
            result.reason = log.reason();
        if (result.reason.empty() && !m_best && isBook(result))
            result.reason = "--best goes on looking for one";
        writeToStandardError(failureLine("cover", result));
    }
    return deliver(result, cover) && cover && !result.error ? kSuccess : kFailure;
}

std::optional<Data> CoverCommand::coverFor(Result& result) const {
    using Inspector = PVAssetMetadataInspector;
    if (m_best)
        return bestFor(result);
    const URL url = urlOfPath(result.path);
    if (m_box)
        return scaled(Inspector::coverImageForAssetAtURL_error(url, &result.error), result);
    return Inspector::coverImageDataForAssetAtURL_error(url, &result.error);
}

std::optional<Data> CoverCommand::bestFor(Result& result) const {
    const std::optional<BestCover> best =
        bestCoverForAssetAtURL(urlOfPath(result.path), &result.error);
    if (!best)
        return std::nullopt;
    if (best->rule != CoverRule::OwnImage) {
        std::string found =
            result.path + ": " + std::string(wordsFor(best->rule)) + ": " + best->image;
        if (!best->page.empty())
            found += ", shown by " + best->page;
        writeToStandardError(problemLine("cover", found));
    }
    return m_box ? scaled(imageFromData(best->bytes), result) : best->bytes;
}

std::optional<Data> CoverCommand::scaled(const std::optional<Image>& image, Result& result) const {
    if (!image) {
        if (!result.error && (m_best || hasCover(result)))
            result.reason = reasonAgainstDecoding();
        return std::nullopt;
    }
    const std::optional<Image> fitting = imageScaledToFit(*image, m_box->width, m_box->height);
    if (!fitting) {
        result.reason = "scaled to fit that box it would be of over 40 megapixels";
        return std::nullopt;
    }
    return pngDataFromImage(*fitting);
}

/// Writes the image, or the result with it.
bool CoverCommand::deliver(Result& result, const std::optional<Data>& cover) const {
    std::vector<std::uint8_t> storage;
    const std::string_view bytes = cover ? cover->text(storage) : std::string_view();
    const bool isStored = !cover || !hasFile() || store(result, bytes);
    if (hasFile())
        result.fields.push_back({"file", cover && isStored ? Value(*m_file) : Value()});
    else
        result.fields.push_back({"cover", cover ? Value(*cover) : Value()});
    Output output(STDOUT_FILENO);
    if (m_output.form() != OutputForm::Text)
        output.append(listOfOne(m_output.form(), result));
    else if (!hasFile())
        output.append(bytes);
    return output.finish("cover") && isStored;
}

bool CoverCommand::store(Result& result, std::string_view bytes) const {
    const int failure = writeFile(*m_file, bytes);
    if (failure == 0)
        return true;
    result.error = makePOSIXError(failure, urlOfPath(*m_file));
    writeToStandardError(problemLine("cover", *m_file + ": " + strerrordesc_np(failure)));
    return false;
}

}  // namespace

std::unique_ptr<Command> makeCoverCommand() {
    return std::make_unique<CoverCommand>();
}

}  // namespace parvel::cli
