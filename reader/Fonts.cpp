#include "reader/Fonts.h"

#include <fontconfig/fontconfig.h>

#include <algorithm>
#include <array>
#include <memory>
#include <set>
#include <string>

#include "reader/HostFiles.h"

namespace parvel::reader {

namespace {

/// The standard fonts of ISO 32000, 9.6.2.2, and the scripts whose fonts are most often left out.
constexpr std::array wantedFonts{"Helvetica",
                                 "Helvetica:bold",
                                 "Helvetica:italic",
                                 "Helvetica:bold:italic",
                                 "Times",
                                 "Times:bold",
                                 "Times:italic",
                                 "Times:bold:italic",
                                 "Courier",
                                 "Courier:bold",
                                 "Courier:italic",
                                 "Courier:bold:italic",
                                 "Symbol",
                                 "ZapfDingbats",
                                 "serif:lang=ja",
                                 "sans:lang=ja",
                                 "serif:lang=ko",
                                 "sans:lang=ko",
                                 "serif:lang=zh-cn",
                                 "sans:lang=zh-cn",
                                 "serif:lang=zh-tw",
                                 "sans:lang=zh-tw"};

using Pattern = std::unique_ptr<FcPattern, decltype(&FcPatternDestroy)>;

std::string fileOf(FcPattern* pattern) {
    FcChar8* file = nullptr;
    if (!pattern || FcPatternGetString(pattern, FC_FILE, 0, &file) != FcResultMatch)
        return {};
    return reinterpret_cast<const char*>(file);
}

/// The file of the host's font that comes nearest.
std::string fileOfNearestFont(const char* name) {
    const Pattern wanted(FcNameParse(reinterpret_cast<const FcChar8*>(name)), &FcPatternDestroy);
    if (!wanted)
        return {};
    FcConfigSubstitute(nullptr, wanted.get(), FcMatchPattern);
    FcDefaultSubstitute(wanted.get());
    FcResult result = FcResultNoMatch;
    const Pattern found(FcFontMatch(nullptr, wanted.get(), &result), &FcPatternDestroy);
    return fileOf(found.get());
}

/// Takes every font out of the set whose file is not among these.
void narrow(FcFontSet* fonts, const std::set<std::string>& files) {
    if (!fonts)
        return;
    FcPattern** end = fonts->fonts + fonts->nfont;
    FcPattern** kept = std::remove_if(fonts->fonts, end, [&](FcPattern* font) {
        const bool isOther = files.count(fileOf(font)) == 0;
        if (isOther)
            FcPatternDestroy(font);
        return isOther;
    });
    fonts->nfont = static_cast<int>(kept - fonts->fonts);
}

}  // namespace

void readyFonts() {
    if (!FcInit())
        return;
    std::set<std::string> files;
    for (const char* name : wantedFonts)
        files.insert(fileOfNearestFont(name));
    for (const std::string& file : files)
        keepHostFile(file);
    for (const FcSetName set : {FcSetSystem, FcSetApplication})
        narrow(FcConfigGetFonts(nullptr, set), files);
}

}  // namespace parvel::reader
