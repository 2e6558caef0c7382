#pragma once

#include <cstring>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include <gtest/gtest.h>

#include "parvel/platform/XattrStore.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// A folder on a file system that keeps extended attributes; its tests are skipped where the
/// temporary directory's does not.
class AttributeFolder : public ::testing::Test {
protected:
    void SetUp() override {
        const std::string probe = m_folder.write("probe", "");
        if (const int errnoValue = XattrStore::host().set(probe, "parvel.probe", {}))
            GTEST_SKIP() << "no extended attributes here: " << strerror(errnoValue);
    }

    /// A file without attributes.
    URL file(std::string_view name = "book.epub") const {
        return URL::fileURLWithPath(m_folder.write(name, "content"));
    }

    static void setStored(const URL& url, std::string_view name, std::string_view value) {
        const int errnoValue =
            XattrStore::host().set(url.path(), std::string(name), std::as_bytes(std::span(value)));
        ASSERT_EQ(errnoValue, 0) << strerror(errnoValue);
    }

    /// The attribute's bytes as the disk has them.
    static std::optional<std::string> stored(const URL& url, std::string_view name) {
        std::string value(65536, '\0');
        std::size_t length = 0;
        if (XattrStore::host().get(url.path(), std::string(name),
                                   std::as_writable_bytes(std::span(value)), length) != 0)
            return std::nullopt;
        value.resize(length);
        return value;
    }

    TemporaryDirectory m_folder;
};

}  // namespace parvel::testing
