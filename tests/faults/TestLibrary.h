#pragma once

#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "parvel/foundation/URL.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// Which item stands where: "from/a.epub" → "package 1".
using Layout = std::map<std::string, std::string>;

/// Folders of whole books in two file systems, for operations that are cut short. A place is a
/// folder's name and an item's; the folders "other" and "other trash/files" lie on the second file
/// system. A place below an item names a member of it, and the item is then told by its members.
/// What stands at a place is told by its content, attributes and modes.
///
/// An item's name says what it is made of, and a digit its content:
/// - "package …" or "file …": with "kept" it has an attribute and a mode that others lack, with
///   "closed" its folders forbid changes, with "barred" one can't be entered, with "private" its
///   files are its owner's alone;
/// - "zip …": a zipped book, and "expanded …" the same one as a package; of the latter's members,
///   "folder …" and "cover …";
/// - "image …": a cover of that content as it is written anew;
/// - "store …": a store metadata file of that title.
class TestLibrary {
public:
    TestLibrary();
    ~TestLibrary();
    TestLibrary(const TestLibrary&) = delete;
    TestLibrary& operator=(const TestLibrary&) = delete;

    /// Makes the items, owned by the user that runs the operations.
    void fill(const Layout& layout);
    [[nodiscard]] std::string path(const std::string& place) const;
    [[nodiscard]] URL url(const std::string& place) const;

    /// What stands in the folders, staging folders left out: the name of an item in `known`, with
    /// " but for modes" where these differ; "info" for a trash's info file, "placeholder" for an
    /// empty item, "part of …" for what lacks some of a known item; else what it is made of.
    [[nodiscard]] Layout layout(const Layout& known) const;
    /// The paths of everything hidden that an operation made for itself.
    [[nodiscard]] std::vector<std::string> litter() const;
    /// The folders that hold items, and those where an operation left something of its own.
    [[nodiscard]] std::vector<std::string> folders() const;
    /// Points the environment of this process here: locks, and the trash of the file system.
    void setEnvironment(bool hasTrashOnOtherFileSystem) const;

private:
    [[nodiscard]] std::string nameOf(const std::string& path, const Layout& known) const;
    void addEntriesOf(const std::string& folder, const Layout& known, Layout& result) const;

    TemporaryDirectory m_here;
    std::filesystem::path m_other;
};

/// The bytes that an item of that name has in each of its files.
[[nodiscard]] std::string contentOf(const std::string& item);

/// Whether the machine has two file systems to move between.
[[nodiscard]] bool hasTwoFileSystems();

}  // namespace parvel::testing
