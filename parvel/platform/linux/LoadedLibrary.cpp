#include "parvel/platform/linux/LoadedLibrary.h"

#include <dlfcn.h>

namespace parvel::host {

LoadedLibrary::LoadedLibrary(const char* soname)
    : m_handle(::dlopen(soname, RTLD_NOW | RTLD_LOCAL)), m_isComplete(m_handle != nullptr) {}

LoadedLibrary::Address LoadedLibrary::function(const char* name) {
    void* address = m_handle ? ::dlsym(m_handle, name) : nullptr;
    m_isComplete = m_isComplete && address;
    return Address(address);
}

}  // namespace parvel::host
