// Measures how long a copy goes on after it was cancelled from another thread.
//
// usage: bench_cancel TASK SOURCE FOLDER ROUNDS
//
// TASK is "package" (a zipped book or a package folder) or "file". Each round copies SOURCE into a
// new place in FOLDER and is cancelled at another moment, spread evenly over the time that a whole
// copy takes. Prints how many rounds were cancelled and, of the milliseconds from the cancel to the
// end of the call, the median, the 99th of 100 and the longest, for all rounds; then the moment of
// the longest one, as a share of a whole copy.

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"
#include "parvel/iotasks/PVCopyAssetMetadataIOTask.h"
#include "parvel/iotasks/PVCrateAssetMetadataIOTask.h"
#include "parvel/metadata/PVMutableAssetMetadata.h"

namespace {

using namespace parvel;
using Clock = std::chrono::steady_clock;
using Milliseconds = std::chrono::duration<double, std::milli>;

struct Round {
    double latency = 0;
    double moment = 0;
    bool wasCancelled = false;
};

class CancelledCopies {
public:
    CancelledCopies(bool isPackage, const std::string& source, std::string folder)
        : m_isPackage(isPackage),
          m_folder(std::move(folder)),
          m_asset(
              PVAssetMetadata::metadataWithURL_dictionary(URL::fileURLWithPath(source), nullptr)) {}

    /// The milliseconds of a copy that nobody cancels; negative where it fails.
    double whole() {
        const auto task = makeTask();
        const auto start = Clock::now();
        const AssetPtr copy =
            task->executeWithTargetDirectory_error(URL::fileURLWithPath(freshPlace()), &m_error);
        const double time = Milliseconds(Clock::now() - start).count();
        return copy ? time : -1;
    }

    Round cancelledAt(double milliseconds) {
        const auto task = makeTask();
        const URL place = URL::fileURLWithPath(freshPlace());
        Clock::time_point cancelled;
        std::thread other([&] {
            std::this_thread::sleep_for(Milliseconds(milliseconds));
            cancelled = Clock::now();
            task->cancel();
        });
        const AssetPtr copy = task->executeWithTargetDirectory_error(place, &m_error);
        const auto ended = Clock::now();
        other.join();
        return {std::max(0.0, Milliseconds(ended - cancelled).count()), milliseconds,
                copy == nullptr};
    }

private:
    std::shared_ptr<PVAssetMetadataIOTask> makeTask() {
        if (m_isPackage)
            return PVCrateAssetMetadataIOTask::initWithSourceMetadata_manager(m_asset, m_manager);
        return PVCopyAssetMetadataIOTask::initWithSourceMetadata_manager(m_asset, m_manager);
    }
    std::string freshPlace() {
        std::filesystem::remove_all(m_place);
        m_place = m_folder + "/" + std::to_string(m_count++);
        std::filesystem::create_directories(m_place);
        return m_place;
    }

    bool m_isPackage;
    std::string m_folder;
    MutableAssetPtr m_asset;
    std::shared_ptr<PVAssetMetadataFileManager> m_manager = PVAssetMetadataFileManager::init();
    std::optional<Error> m_error;
    std::string m_place;
    int m_count = 0;
};

}  // namespace

int main(int argumentCount, char** arguments) {
    if (argumentCount != 5)
        return 2;
    CancelledCopies copies(std::string_view(arguments[1]) == "package", arguments[2], arguments[3]);
    std::vector<double> wholes;
    for (int i = 0; i < 3; ++i)
        wholes.push_back(copies.whole());
    std::sort(wholes.begin(), wholes.end());
    if (wholes.front() < 0)
        return 1;
    const double whole = wholes[1];
    const int count = std::max(1, std::atoi(arguments[4]));
    std::vector<Round> rounds;
    rounds.reserve(static_cast<std::size_t>(count));
    for (int i = 0; i < count; ++i)
        rounds.push_back(copies.cancelledAt(whole * i / count));
    std::sort(rounds.begin(), rounds.end(),
              [](const Round& left, const Round& right) { return left.latency < right.latency; });
    const auto cancelled = std::count_if(rounds.begin(), rounds.end(),
                                         [](const Round& round) { return round.wasCancelled; });
    std::printf(
        "whole %.1f ms, cancelled %ld of %d: median %.2f, 99 %% %.2f, longest %.2f at %.2f\n",
        whole, static_cast<long>(cancelled), count, rounds[rounds.size() / 2].latency,
        rounds[rounds.size() * 99 / 100].latency, rounds.back().latency,
        rounds.back().moment / whole);
    return 0;
}
