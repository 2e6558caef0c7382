#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "parvel/foundation/PVExport.h"

namespace parvel {

/// What confines the helper program, parvel-reader, which parses PDF documents and images. Where it
/// can't be had, PDF documents can't be opened and images not decoded; all else works.
struct ReaderConfinement {
    bool hasSystemCallFilter = false;  ///< a seccomp filter
    bool hasNoFiles = false;           ///< Landlock, without any path
};

/// Says where the helper program is, for an application that keeps it elsewhere than in the
/// library's installation; an empty path takes that back. Call it before other threads use the
/// library.
PV_EXPORT void setReaderProgramPath(std::string_view path);
/// Where the helper program is looked for.
PV_EXPORT std::string readerProgramPath();
/// How the helper program is confined on this host: it is started for it where none waits. None
/// where it can't be had.
PV_EXPORT std::optional<ReaderConfinement> readerConfinement();

}  // namespace parvel
