#include "parvel/platform/Localiser.h"

#include <libintl.h>

#include <string_view>

namespace parvel {

namespace {

constexpr const char* kTextDomain = "parvel";

class GettextLocaliser final : public Localiser {
public:
    std::string text(const char* key, const char* untranslated) override {
        for (const char* domain : {static_cast<const char*>(nullptr), kTextDomain}) {
            const std::string_view translated = ::dgettext(domain, key);
            if (translated != key)
                return std::string(translated);
        }
        return untranslated;
    }
};

}  // namespace

Localiser& Localiser::host() {
    static GettextLocaliser localiser;
    return localiser;
}

}  // namespace parvel
