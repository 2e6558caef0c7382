#include <gtest/gtest.h>

#include "cli/RecordFile.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {
namespace {

/// Files of many records.
class RecordsFromFile : public ::testing::Test {
protected:
    using Titles = std::vector<std::string>;

    /// The titles of the records in a file of that text, with their results' PATHs behind them.
    Titles titles(std::string_view text) {
        m_folder.write("records", text);
        m_problem.clear();
        const auto records = cli::recordsFromFile(m_folder / "records", m_problem);
        if (!records)
            return {"none"};
        Titles found;
        for (const cli::StoredRecord& each : *records) {
            const Value* title = each.record.find("itemName");
            found.push_back((title ? *title->as<String>() : "") +
                            (each.path ? " at " + *each.path : ""));
        }
        return found;
    }

    TemporaryDirectory m_folder;
    std::string m_problem;
};

TEST_F(RecordsFromFile, AreTheDictionariesOfAnArray) {
    EXPECT_EQ(titles(R"([{"itemName":"A"},{"itemName":"B"}])"), (Titles{"A", "B"}));
}

TEST_F(RecordsFromFile, AreThoseOfResultsWithTheirPaths) {
    EXPECT_EQ(titles(R"([{"path":"a.epub","assetType":"epub","record":{"itemName":"A"},)"
                     R"("error":null}])"),
              (Titles{"A at a.epub"}));
}

TEST_F(RecordsFromFile, LeaveOutResultsWithoutOne) {
    EXPECT_EQ(titles(R"([{"path":"a.epub","assetType":"epub","record":null,"error":null}])"),
              Titles());
}

TEST_F(RecordsFromFile, MayStandOneALine) {
    EXPECT_EQ(titles("{\"itemName\":\"A\"}\n\r\n{\"itemName\":\"B\"}"), (Titles{"A", "B"}));
}

TEST_F(RecordsFromFile, MayBeOneAlone) {
    EXPECT_EQ(titles(R"({"itemName":"A"})"), (Titles{"A"}));
}

TEST_F(RecordsFromFile, MayStandInAPropertyList) {
    EXPECT_EQ(titles("<plist><array><dict><key>itemName</key><string>A</string></dict>"
                     "</array></plist>"),
              (Titles{"A"}));
}

TEST_F(RecordsFromFile, MayBeNoLinesAtAll) {
    EXPECT_EQ(titles(""), Titles());
}

TEST_F(RecordsFromFile, AreNoneOutOfAnythingElse) {
    EXPECT_EQ(titles("hello"), (Titles{"none"}));
    EXPECT_TRUE(m_problem.starts_with("neither a property list nor JSON: ")) << m_problem;
    EXPECT_EQ(titles("{\"itemName\":\"A\"}\nhello"), (Titles{"none"}));
    EXPECT_EQ(titles("[1]"), (Titles{"none"}));
    EXPECT_EQ(m_problem, "holds something else than records and results");
    EXPECT_EQ(titles("<plist><arr"), (Titles{"none"}));
    EXPECT_EQ(m_problem, "a damaged property list");
}

TEST_F(RecordsFromFile, AreNoneOutOfAFileThatIsMissing) {
    EXPECT_FALSE(cli::recordsFromFile(m_folder / "absent", m_problem));
    EXPECT_EQ(m_problem, "No such file or directory");
}

}  // namespace
}  // namespace parvel::testing
