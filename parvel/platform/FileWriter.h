#pragma once

#include "parvel/foundation/Data.h"
#include "parvel/foundation/ErrorOut.h"
#include "parvel/foundation/URL.h"

namespace parvel {

/// Writes whole files. All errors are those of makeServiceError.
class FileWriter {
public:
    virtual ~FileWriter() = default;

    /// Puts a file of these bytes in the place of whatever file or link stands there, in one step:
    /// written beside it, synced, renamed. A replaced file's attributes, owner, group, access list
    /// and mode go on, without set-id bits. Who may not give files away becomes the owner of what
    /// he writes; a group that he is no member of can't be kept either, and then that one's members
    /// and all others are left what both of them might do. After a failure the old file stands as
    /// it was, or the new one whole.
    virtual bool writeFile(const URL& url, const Data& bytes, ErrorOut error = nullptr) = 0;

    static FileWriter& host();
};

}  // namespace parvel
