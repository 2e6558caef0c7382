#include <array>

#include "cli/Command.h"

namespace parvel::cli {

std::span<const CommandEntry> commands() {
    static constexpr std::array entries{
        CommandEntry{"inspect", "PATH...", "Print what is known of books, PDFs and audiobooks.",
                     makeInspectCommand},
        CommandEntry{"attributes", "PATH...",
                     "Print or write what is kept on the files themselves.", makeAttributesCommand},
        CommandEntry{"cover", "PATH", "Write the cover image of an asset.", makeCoverCommand},
        CommandEntry{"match", "A B", "Tell whether two assets, or records, are the same asset.",
                     makeMatchCommand},
        CommandEntry{"install", "PATH...", "Bring assets into a folder of the library.",
                     makeInstallCommand},
        CommandEntry{"edit", "PATH...", "Change titles, covers and whatever else records hold.",
                     makeEditCommand},
        CommandEntry{"inflate", "PATH...", "Expand zipped books in their places.",
                     makeInflateCommand},
        CommandEntry{"pack", "PATH", "Make a zipped book of a package folder.", makePackCommand},
        CommandEntry{"update", "NEW...", "Bring new versions of assets into the library.",
                     makeUpdateCommand},
        CommandEntry{"move", "PATH...", "Move assets to another place or into a folder.",
                     makeMoveCommand},
        CommandEntry{"rename", "PATH...", "Name PDF documents after their display names.",
                     makeRenameCommand},
        CommandEntry{"trash", "PATH...", "Move assets to the desktop's trash, or bring them back.",
                     makeTrashCommand},
        CommandEntry{"remove", "PATH...", "Delete assets for good.", makeRemoveCommand},
        CommandEntry{"redact", "PATH...", "Move assets aside as redacted ones.", makeRedactCommand},
        CommandEntry{"cloud", "add|take|replace|status PATH...",
                     "Move assets into and out of synchronised folders.", makeCloudCommand},
        CommandEntry{"check", "[DIR|PATH...]", "Compare records with what is on the disk.",
                     makeCheckCommand},
        CommandEntry{"doctor", "[DIR|PATH...]", "Say what endangers assets, and what to do.",
                     makeDoctorCommand},
    };
    return entries;
}

}  // namespace parvel::cli
