#pragma once

#include <filesystem>
#include <fstream>
#include <map>
#include <string>
#include <string_view>

#include "parvel/foundation/URL.h"
#include "tests/support/PackageDocuments.h"
#include "tests/support/ZipBuilder.h"

namespace parvel::testing {

/// Builds a packaged book, zipped or expanded: at first one with an empty OPF, which its container
/// document names. `EpubBuilder{}.opf(opfText("<dc:title>T</dc:title>")).zip(folder / "b.epub")`
class EpubBuilder {
public:
    static constexpr std::string_view opfPath = "OPS/content.opf";

    EpubBuilder() { container(containerText(opfPath)).opf(opfText("")); }

    EpubBuilder& container(std::string_view text) { return file("META-INF/container.xml", text); }
    EpubBuilder& opf(std::string_view text) { return file(opfPath, text); }
    /// The store metadata file.
    EpubBuilder& store(std::string_view bytes) { return file("BazaarMetadata.plist", bytes); }
    EpubBuilder& file(std::string_view name, std::string_view bytes) {
        m_files[std::string(name)] = bytes;
        return *this;
    }
    EpubBuilder& without(std::string_view name) {
        m_files.erase(std::string(name));
        return *this;
    }

    /// Writes a zip archive and gives its URL.
    URL zip(const std::string& path) const {
        ZipBuilder archive;
        archive.stored("mimetype", "application/epub+zip");
        for (const auto& [name, bytes] : m_files)
            archive.deflated(name, bytes);
        std::ofstream(path, std::ios::binary) << archive.bytes();
        return URL::fileURLWithPath(path);
    }
    /// Writes a package folder and gives its URL.
    URL expand(const std::string& path) const {
        for (const auto& [name, bytes] : m_files) {
            const std::filesystem::path member = std::filesystem::path(path) / name;
            std::filesystem::create_directories(member.parent_path());
            std::ofstream(member, std::ios::binary) << bytes;
        }
        return URL::fileURLWithPath(path);
    }

private:
    std::map<std::string, std::string> m_files;
};

}  // namespace parvel::testing
