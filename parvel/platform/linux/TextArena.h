#pragma once

#include <algorithm>
#include <cstddef>
#include <memory>
#include <string_view>
#include <vector>

namespace parvel {

/// Keeps copies of short texts. They stay where they are as long as the arena lives, also when it
/// is moved.
class TextArena {
public:
    [[nodiscard]] std::string_view keep(std::string_view text) {
        if (text.size() > m_room) {
            const std::size_t size = std::max(kBlock, text.size());
            m_blocks.push_back(std::make_unique_for_overwrite<char[]>(size));
            m_next = m_blocks.back().get();
            m_room = size;
        }
        char* const copy = m_next;
        std::copy(text.begin(), text.end(), copy);
        m_next += text.size();
        m_room -= text.size();
        return {copy, text.size()};
    }

private:
    static constexpr std::size_t kBlock = 4096;

    std::vector<std::unique_ptr<char[]>> m_blocks;
    char* m_next = nullptr;
    std::size_t m_room = 0;
};

}  // namespace parvel
