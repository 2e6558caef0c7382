#include <gtest/gtest.h>

#include <memory>
#include <thread>

#include "parvel/inspection/PVAssetMetadataInspector.h"
#include "tests/corpus/CorpusBook.h"

namespace parvel::testing {
namespace {

struct Inspection {
    AssetPtr record;
    std::optional<Error> error;

    bool operator==(const Inspection& other) const {
        const bool same = record ? record->isEqual(other.record.get()) : !other.record;
        return same && error == other.error;
    }
};

Inspection inspect(const URL& url) {
    Inspection result;
    result.record =
        PVAssetMetadataInspector::metadataIncludingCoverForAssetAtURL_error(url, &result.error);
    return result;
}

TEST(CorpusThreads, SixteenAtOnceReadWhatOneReads) {
    if (corpusFolder().empty())
        GTEST_SKIP() << kNoCorpus;
    std::vector<std::unique_ptr<CorpusBook>> books;
    std::vector<Inspection> alone;
    for (const Expectation& expectation : Expectation::all()) {
        books.push_back(std::make_unique<CorpusBook>(expectation));
        alone.push_back(inspect(books.back()->url()));
    }

    constexpr std::size_t kThreads = 16;
    std::vector<std::vector<std::string>> different(kThreads);
    std::vector<std::jthread> threads;
    for (std::size_t thread = 0; thread < kThreads; ++thread) {
        threads.emplace_back([&, thread] {
            for (std::size_t step = 0; step < books.size(); ++step) {
                const std::size_t index = (step + thread / 4 * 7) % books.size();
                if (!(inspect(books[index]->url()) == alone[index]))
                    different[thread].push_back(books[index]->expectation().file());
            }
        });
    }
    threads.clear();

    for (const std::vector<std::string>& files : different)
        EXPECT_EQ(files, std::vector<std::string>());
}

}  // namespace
}  // namespace parvel::testing
