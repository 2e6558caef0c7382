#pragma once

#include <cerrno>
#include <functional>
#include <string>
#include <vector>

#include "parvel/platform/ArchiveCopier.h"

namespace parvel::testing {

/// Keeps what an archive copier tells, and answers file errors as it is told to.
class RecordingCopierCallbacks : public ArchiveCopierCallbacks {
public:
    struct Finished {
        std::string path;
        ArchiveObjectType type;
        std::uint64_t size;
        friend bool operator==(const Finished&, const Finished&) = default;
    };
    struct Failed {
        std::string path;
        int error;
        friend bool operator==(const Failed&, const Failed&) = default;
    };

    void fatalError(ArchiveCopier&) override { fatal.push_back(errno); }
    int fileError(ArchiveCopier&, const std::string& path, int errnoValue) override {
        errnoWasSet = errnoWasSet && errno == errnoValue;
        failed.push_back({path, errnoValue});
        return answer;
    }
    void fileFinished(ArchiveCopier&, const std::string& path, ArchiveObjectType type,
                      std::uint64_t size) override {
        finished.push_back({path, type, size});
        if (onFinished)
            onFinished();
    }

    int answer = kStopAfterFileError;
    std::function<void()> onFinished;

    std::vector<int> fatal;
    std::vector<Failed> failed;
    std::vector<Finished> finished;
    bool errnoWasSet = true;
};

}  // namespace parvel::testing
