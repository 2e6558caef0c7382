#pragma once

#include <utility>

#include "parvel/platform/Localiser.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// Has one translation, of the key and untranslated text "key=text", in force while it lives.
class TranslatingLocaliser : public Localiser {
public:
    TranslatingLocaliser(std::string asked, std::string translation)
        : m_asked(std::move(asked)), m_translation(std::move(translation)) {}

    std::string text(const char* key, const char* untranslated) override {
        const bool isKnown = std::string(key) + "=" + untranslated == m_asked;
        return isKnown ? m_translation : untranslated;
    }

private:
    std::string m_asked;
    std::string m_translation;
    Service<Localiser>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
