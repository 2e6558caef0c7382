#include "cli/ResultFormat.h"

#include "cli/JsonWriter.h"

namespace parvel::cli {
namespace {

void appendError(const Error& error, std::string& out) {
    out += R"({"domain":)";
    appendJsonString(error.domain(), out);
    out += R"(,"code":)" + std::to_string(error.code()) + R"(,"url":)";
    if (const URL* url = error.url())
        appendJsonString(url->absoluteString(), out);
    else
        out += "null";
    out += R"(,"message":)";
    appendJsonString(error.message(), out);
    out.push_back('}');
}

void appendResult(const Result& result, std::string& out) {
    out += R"({"path":)";
    appendJsonString(result.path, out);
    out += R"(,"assetID":)";
    if (result.assetID)
        appendJsonString(*result.assetID, out);
    else
        out += "null";
    out += R"(,"assetType":")";
    out += assetTypeName(result.assetType);
    out += "\",";
    appendJsonString(result.recordKey, out);
    out.push_back(':');
    if (result.record)
        appendJson(*result.record, out);
    else
        out += "null";
    out += R"(,"error":)";
    if (result.error)
        appendError(*result.error, out);
    else
        out += "null";
    for (const auto& [key, value] : result.fields) {
        out.push_back(',');
        appendJsonString(key, out);
        out.push_back(':');
        appendJson(value, out);
    }
    out.push_back('}');
}

class JsonFormat : public ResultFormat {
public:
    void append(const Result& result, std::string& out) const override {
        appendResult(result, out);
    }
    [[nodiscard]] std::string_view opening() const override { return "["; }
    [[nodiscard]] std::string_view separator() const override { return ",\n"; }
    [[nodiscard]] std::string_view closing() const override { return "]\n"; }
};

class JsonLinesFormat : public ResultFormat {
public:
    void append(const Result& result, std::string& out) const override {
        appendResult(result, out);
        out.push_back('\n');
    }
    [[nodiscard]] bool keepsOrder() const override { return false; }
};

}  // namespace

std::unique_ptr<ResultFormat> ResultFormat::make(OutputForm form, MakeResultFormat makeText) {
    switch (form) {
        case OutputForm::Text:
            return makeText();
        case OutputForm::Json:
            return std::make_unique<JsonFormat>();
        case OutputForm::JsonLines:
            return std::make_unique<JsonLinesFormat>();
        case OutputForm::PropertyList:
            return makePropertyListFormat();
    }
    return nullptr;
}

std::string listOfOne(OutputForm form, const Result& result) {
    const std::unique_ptr<ResultFormat> format = ResultFormat::make(form);
    std::string text(format->opening());
    format->append(result, text);
    text += format->closing();
    return text;
}

}  // namespace parvel::cli
