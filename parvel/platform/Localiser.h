#pragma once

#include <string>

namespace parvel {

/// The application's translated texts.
class Localiser {
public:
    virtual ~Localiser() = default;
    /// The translation of a key in the application's own messages, else in the library's; the given
    /// text where neither has one.
    [[nodiscard]] virtual std::string text(const char* key, const char* untranslated) = 0;

    static Localiser& host();
};

}  // namespace parvel
