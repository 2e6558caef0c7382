#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <vector>

namespace parvel {

/// Extended attributes of the file or folder at a path, symbolic links followed. Names are the
/// library's own ("com.kestrel.Folium.title"); the host's namespace prefix is added here, the same
/// for every operation. Every operation fails by giving the errno value in place of 0.
class XattrStore {
public:
    virtual ~XattrStore() = default;

    /// Makes the name into that under which an attribute is kept with its file when that is copied
    /// or synchronised; false, with errno set, where that can't be made.
    [[nodiscard]] virtual bool decorate(std::string& name) = 0;

    /// The value's size in bytes. ENODATA when there is no such attribute.
    [[nodiscard]] virtual int size(const std::string& path, const std::string& name,
                                   std::size_t& size) = 0;
    /// Reads at most the buffer's length; ERANGE when the value is longer.
    [[nodiscard]] virtual int get(const std::string& path, const std::string& name,
                                  std::span<std::byte> buffer, std::size_t& length) = 0;
    /// Creates or replaces.
    [[nodiscard]] virtual int set(const std::string& path, const std::string& name,
                                  std::span<const std::byte> value) = 0;
    /// ENODATA when there is no such attribute.
    [[nodiscard]] virtual int remove(const std::string& path, const std::string& name) = 0;
    /// The names that stand there, as the other operations take them; in one or two calls to the
    /// host. No read permission is needed, and where no attributes are kept the list is empty, so
    /// one who wants to know whether a missing name could have been read asks for it.
    [[nodiscard]] virtual int list(const std::string& path, std::vector<std::string>& names) = 0;

    static XattrStore& host();
};

}  // namespace parvel
