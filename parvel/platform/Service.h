#pragma once

#include <atomic>

namespace parvel {

/// The one place of a platform service: the host's own implementation, unless a test has put
/// another in its place for a scope.
///
/// Each interface declares a static `host()`; its definition stands beside the implementation in
/// platform/linux.
template <class Interface>
class Service {
public:
    /// The service now in force. Callable from any thread.
    [[nodiscard]] static Interface& current() {
        Interface* replacement = s_replacement.load(std::memory_order_acquire);
        return replacement ? *replacement : Interface::host();
    }

    /// Puts another implementation in force for all threads while it lives. Scopes nest.
    class Replacement {
    public:
        explicit Replacement(Interface& service)
            : m_previous(s_replacement.exchange(&service, std::memory_order_acq_rel)) {}
        ~Replacement() { s_replacement.store(m_previous, std::memory_order_release); }
        Replacement(const Replacement&) = delete;
        Replacement& operator=(const Replacement&) = delete;

    private:
        Interface* m_previous;
    };

private:
    static inline std::atomic<Interface*> s_replacement{nullptr};
};

}  // namespace parvel
