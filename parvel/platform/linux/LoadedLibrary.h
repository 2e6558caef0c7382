#pragma once

#include <atomic>
#include <memory>

namespace parvel::host {

/// A shared library that is loaded when it is first used instead of with the program, whose start
/// would pay for it otherwise. It is never unloaded. One is derived for each such library, with a
/// member for each function of it that is used:
///
///     class Libexample : public LoadedLibrary {
///     public:
///         using LoadedLibrary::LoadedLibrary;
///         static const Libexample& host() { return loadedOnce<Libexample>("libexample.so.1"); }
///         PARVEL_LOADED_FUNCTION(example_open);
///     };
class LoadedLibrary {
public:
    LoadedLibrary() = default;
    /// Looks for the library where the program's own are looked for.
    explicit LoadedLibrary(const char* soname);
    LoadedLibrary(const LoadedLibrary&) = delete;
    LoadedLibrary& operator=(const LoadedLibrary&) = delete;

    /// Whether the library was loaded and has every function; else none of them may be called.
    [[nodiscard]] bool isComplete() const { return m_isComplete; }

protected:
    /// Whatever type of function the library's header gives to the name.
    class Address {
    public:
        explicit Address(void* address) : m_address(address) {}
        template <typename Function>
        operator Function*() const {
            return reinterpret_cast<Function*>(m_address);
        }

    private:
        void* m_address;
    };

    [[nodiscard]] Address function(const char* name);

    /// The process's one of its class. One that is not complete is looked for again by the next
    /// call: there may have been no descriptor to open it with.
    template <class Library>
    [[nodiscard]] static const Library& loadedOnce(const char* soname) {
        static std::atomic<const Library*> loaded{nullptr};
        const Library* library = loaded.load(std::memory_order_acquire);
        if (library)
            return *library;
        auto made = std::make_unique<const Library>(soname);
        static const Library none;
        if (!made->isComplete())
            return none;
        const bool isFirst = loaded.compare_exchange_strong(library, made.get());
        return isFirst ? *made.release() : *library;
    }

private:
    void* const m_handle = nullptr;
    bool m_isComplete = false;
};

}  // namespace parvel::host

/// Declares a member that is named and typed as the library's header has it. Some headers name a
/// function by a macro, which is expanded first.
#define PARVEL_LOADED_FUNCTION(name) decltype(&::name) const name = function(PARVEL_TEXT_OF(name))
#define PARVEL_TEXT_OF(name) #name
