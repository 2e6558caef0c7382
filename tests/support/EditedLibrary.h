#pragma once

#include <filesystem>
#include <string>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/support/EpubBuilder.h"
#include "tests/support/ManagedFolder.h"

namespace parvel::testing {

/// A library of one book that is edited, and a folder to expand it in.
class EditedLibrary : public ManagedFolder {
protected:
    void SetUp() override {
        makeFolder("library");
        makeFolder("temporary");
    }

    static EpubBuilder builder() {
        return EpubBuilder{}
            .opf(opfText("<dc:title>Old</dc:title><dc:creator>Author</dc:creator>"))
            .file("OPS/text.xhtml", "text");
    }
    /// The inspected record, with its identity on disk.
    AssetPtr inspected(const URL& url) {
        const AssetPtr record =
            PVAssetMetadataInspector::metadataForAssetAtURL_error(url, &m_error);
        if (record)
            (void)m_manager->setExtendedAttributesForAsset_error(record);
        return record;
    }
    AssetPtr zippedBook() { return inspected(builder().zip(m_folder / "library/a.epub")); }
    AssetPtr expandedBook() { return inspected(builder().expand(m_folder / "library/a.epub")); }
    MutableAssetPtr pdf(const std::string& name, Dictionary entries = {}) {
        return PVAssetMetadata::metadataWithURL_dictionary(asset(name)->url(), &entries);
    }

    [[nodiscard]] bool isFolder(const std::string& name) const {
        return std::filesystem::is_directory(m_folder / name);
    }
};

}  // namespace parvel::testing
