#pragma once

#include <functional>
#include <string>
#include <vector>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "tests/faults/TestLibrary.h"

namespace parvel::testing {

/// An operation that is cut short everywhere: a row of a table in Operations.cpp,
/// InstallOperations.cpp or EditOperations.cpp.
struct Operation {
    std::string name;
    Layout before;
    Layout after;
    /// Whether it succeeded; called in a process of its own.
    std::function<bool(PVAssetMetadataFileManager& manager, const TestLibrary& library)> run;
    /// What else it may leave when it failed or was killed on the way.
    std::vector<Layout> between = {};
    /// What else a kill may leave, for the length of one system call.
    std::vector<Layout> killed = {};
    /// What else a failure may leave.
    std::vector<Layout> failed = {};
    /// What else it may leave with success: a step failed whose failure it passes over.
    std::vector<Layout> succeeded = {};
    /// What else it may leave where a name is held by an empty item that could not be removed: it
    /// counted past that one.
    std::vector<Layout> besideHeldNames = {};
    /// What more must hold whatever happened; what is wrong, or nothing.
    std::function<std::string(const TestLibrary& library)> alsoHolds = nullptr;
    /// Made ready before it runs, where a layout does not say all.
    std::function<void(const TestLibrary& library)> prepare = nullptr;
    bool completesWhatIsLeft = false;  ///< tried again, it also clears what it left itself
    bool answers = true;               ///< whether its result tells its success
    bool hasTrashOnOtherFileSystem = false;

    [[nodiscard]] bool needsTwoFileSystems() const;
};

[[nodiscard]] const std::vector<Operation>& operations();

/// The name that a failed test is known by.
void PrintTo(const Operation& operation, std::ostream* stream);

}  // namespace parvel::testing
