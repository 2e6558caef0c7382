#pragma once

#include <signal.h>
#include <ucontext.h>

#include <cstddef>
#include <cstdint>

namespace parvel::reader {

/// A system call that the filter turned into SIGSYS, as the handler finds it in the registers.
class TrappedCall {
public:
    TrappedCall(const siginfo_t& information, void* context)
        : m_number(information.si_syscall),
          m_registers(static_cast<ucontext_t*>(context)->uc_mcontext) {}

    [[nodiscard]] int number() const { return m_number; }
    template <class T>
    [[nodiscard]] T* pointer(std::size_t index) const {
        return reinterpret_cast<T*>(argument(index));
    }

#if defined(__x86_64__)
    [[nodiscard]] std::uintptr_t argument(std::size_t index) const {
        constexpr int order[] = {REG_RDI, REG_RSI, REG_RDX, REG_R10, REG_R8, REG_R9};
        return static_cast<std::uintptr_t>(m_registers.gregs[order[index]]);
    }
    void setResult(long result) {
        m_registers.gregs[REG_RAX] = result;
    }
#elif defined(__aarch64__)
    [[nodiscard]] std::uintptr_t argument(std::size_t index) const {
        return m_registers.regs[index];
    }
    void setResult(long result) {
        m_registers.regs[0] = static_cast<unsigned long long>(result);
    }
#else
#error "Which registers hold a system call's arguments must be said for this processor."
#endif

private:
    int m_number;
    mcontext_t& m_registers;
};

}  // namespace parvel::reader
