#include <gtest/gtest.h>
#include <time.h>

#include <fstream>

#include "parvel/platform/ZipArchive.h"
#include "tests/support/TemporaryDirectory.h"
#include "tests/support/ZipBuilder.h"

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool isSanitized = true;
#else
constexpr bool isSanitized = false;
#endif

namespace parvel::testing {
namespace {

constexpr std::size_t entryCount = 1'000'000;

/// Changes the six digits at the end of each entry's name in an archive's local headers or
/// directory, which repeats one entry of the given length.
void numberNames(std::string& bytes, std::size_t start, std::size_t stride, std::size_t nameEnd) {
    for (std::size_t i = 0; i < entryCount; ++i) {
        std::size_t rest = i;
        for (std::size_t digit = 0; digit < 6; ++digit, rest /= 10)
            bytes[start + i * stride + nameEnd - 1 - digit] = static_cast<char>('0' + rest % 10);
    }
}

/// An archive of a million empty entries "OEBPS/000000" and so on, too many for the plain record.
std::string millionEntries() {
    constexpr std::size_t nameLength = 12;
    constexpr std::size_t localLength = 30 + nameLength;
    constexpr std::size_t recordLength = 46 + nameLength;
    const std::string one = ZipBuilder{}.stored("OEBPS/000000", "").bytes();
    std::string bytes;
    bytes.reserve(entryCount * (localLength + recordLength) + 100);
    for (std::size_t i = 0; i < entryCount; ++i)
        bytes.append(one, 0, localLength);
    for (std::size_t i = 0; i < entryCount; ++i) {
        bytes.append(one, localLength, recordLength);
        const std::size_t offset = i * localLength;
        for (std::size_t byte = 0; byte < 4; ++byte)
            bytes[bytes.size() - nameLength - 4 + byte] = static_cast<char>(offset >> 8 * byte);
    }
    numberNames(bytes, 0, localLength, localLength);
    numberNames(bytes, entryCount * localLength, recordLength, recordLength);
    const std::string end =
        ZipBuilder{}
            .zip64()
            .count(entryCount)
            .directorySizeError(static_cast<std::int64_t>(entryCount * recordLength))
            .directoryOffsetError(static_cast<std::int64_t>(entryCount * localLength))
            .bytes();
    const std::size_t record64 = bytes.size();
    bytes += end;
    for (std::size_t byte = 0; byte < 4; ++byte)  // where the locator says that record is
        bytes[record64 + 56 + 8 + byte] = static_cast<char>(record64 >> 8 * byte);
    return bytes;
}

double threadSeconds() {
    timespec time;
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) / 1e9;
}

/// The most memory that the process held since the last call, in MB; none where that can't be told.
std::optional<long> peakMegabytes() {
    std::optional<long> kilobytes;
    std::ifstream status("/proc/self/status");
    for (std::string line; std::getline(status, line);)
        if (line.starts_with("VmHWM:"))
            kilobytes = std::stol(line.substr(6));
    std::ofstream reset("/proc/self/clear_refs");
    reset << "5" << std::flush;
    return reset && kilobytes ? std::optional(*kilobytes / 1024) : std::nullopt;
}

TEST(ZipDirectorySize, OneOfAMillionEntriesTakesLittleTimeAndMemory) {
    TemporaryDirectory folder;
    folder.write("a.zip", millionEntries());
    static_cast<void>(peakMegabytes());
    const std::optional<long> before = peakMegabytes();
    const double start = threadSeconds();

    const std::unique_ptr<ZipArchive> archive = ZipReader::host().open(folder.url("a.zip"));
    ASSERT_TRUE(archive);
    EXPECT_TRUE(archive->readEntry("OEBPS/999999", 100));

    const double seconds = threadSeconds() - start;
    const std::optional<long> after = peakMegabytes();
    EXPECT_FALSE(archive->readEntry("OEBPS/1000000", 100));
    if (isSanitized || !before || !after)
        GTEST_SKIP() << "time and memory can't be told in this build";
    EXPECT_LT(seconds, 0.5);
    EXPECT_LT(*after - *before, 32);
}

TEST(ZipDirectorySize, AMillionEntriesThatNeedTheFullReaderAreNoArchive) {
    TemporaryDirectory folder;
    std::string bytes = millionEntries();
    bytes[bytes.size() - 2] = 1;
    bytes += "c";
    folder.write("a.zip", bytes);
    static_cast<void>(peakMegabytes());
    const std::optional<long> before = peakMegabytes();

    EXPECT_FALSE(ZipReader::host().open(folder.url("a.zip")));

    const std::optional<long> after = peakMegabytes();
    if (isSanitized || !before || !after)
        GTEST_SKIP() << "memory can't be told in this build";
    EXPECT_LT(*after - *before, 100);
}

}  // namespace
}  // namespace parvel::testing
