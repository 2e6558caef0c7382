#pragma once

#include <concepts>
#include <memory>
#include <optional>
#include <utility>

#include "parvel/foundation/Error.h"

namespace parvel {

/// The optional place for an operation's error, always its last parameter. Null: the caller did not
/// ask. Judge success by the result, never by the slot: it may be stale, be set beside a good
/// result, or be left untouched.
using ErrorOut = std::optional<Error>*;

/// Sets the caller's slot, to none too, where there is one.
inline void assign(ErrorOut error, std::optional<Error> value) {
    if (error)
        *error = std::move(value);
}

/// What `fail` returns: "none" or false, whichever the operation gives.
struct Failure {
    /// To bool and to nothing that a bool converts to: an optional number would else hold a 0.
    template <std::same_as<bool> Flag>
    operator Flag() const {
        return false;
    }
    operator std::nullopt_t() const { return std::nullopt; }
    /// Better than the optional's own conversion, which would make an optional that holds false.
    operator std::optional<bool>() && { return std::nullopt; }
    template <class T>
    operator std::optional<T>() const {
        return std::nullopt;
    }
    template <class T>
    operator std::shared_ptr<T>() const {
        return nullptr;
    }
    template <class T>
    operator std::unique_ptr<T>() const {
        return nullptr;
    }
};

/// Writes the error where the caller asked for it: `return fail(error, makeMissingURLError());`
inline Failure fail(ErrorOut error, Error value) {
    assign(error, std::move(value));
    return {};
}

/// A place for an error where the operation must always have one: the caller's own, or a local one.
class ErrorSlot {
public:
    explicit ErrorSlot(ErrorOut callers) : m_out(callers ? callers : &m_own) {}
    ErrorSlot(const ErrorSlot&) = delete;
    ErrorSlot& operator=(const ErrorSlot&) = delete;

    [[nodiscard]] ErrorOut out() { return m_out; }
    [[nodiscard]] const std::optional<Error>& value() const { return *m_out; }

private:
    std::optional<Error> m_own;
    ErrorOut m_out;
};

}  // namespace parvel
