#include <array>

#include "cli/Command.h"

namespace parvel::cli {

std::span<const CommandEntry> commands() {
    static constexpr std::array entries{
        CommandEntry{"inspect", "PATH...", "Print what is known of books, PDFs and audiobooks.",
                     makeInspectCommand},
        CommandEntry{"attributes", "PATH...",
                     "Print or write what is kept on the files themselves.", makeAttributesCommand},
        CommandEntry{"match", "A B", "Tell whether two assets, or records, are the same asset.",
                     makeMatchCommand},
    };
    return entries;
}

}  // namespace parvel::cli
