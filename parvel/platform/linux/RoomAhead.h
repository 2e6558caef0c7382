#pragma once

#include <cstdint>
#include <optional>

namespace parvel::host {

/// Has the file system find room for a file ahead of what is written, where it finds much at once
/// sooner than little by little. It is a hint: that there is no room is told by the write.
class RoomAhead {
public:
    /// For an empty file that is to have the size.
    RoomAhead(int file, std::uint64_t size) : m_file(file), m_size(size) {}

    /// Tells how much of it stands, before more is written.
    void reached(std::uint64_t written);
    /// Gives back what was found and is not written.
    void giveBack();

private:
    int m_file;
    std::uint64_t m_size;
    std::uint64_t m_found = 0;
    std::optional<bool> m_isOfUse;
};

}  // namespace parvel::host
