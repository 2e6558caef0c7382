#pragma once

#include <cerrno>
#include <map>
#include <utility>
#include <vector>

#include "parvel/platform/FileCoordinator.h"

namespace parvel::testing {

/// Lets everybody write at once, each to the URL that he asks for, unless a test says otherwise of
/// a call, by its number from 1.
class ScriptedCoordinator : public FileCoordinator {
public:
    using Call = std::pair<URL, WritingIntent>;

    bool coordinateWriting(const URL& url, WritingIntent intent, ErrorOut error,
                           const Accessor& accessor) override {
        calls.emplace_back(url, intent);
        if (calls.size() == refusedCall)
            return fail(error, makePOSIXError(EDEADLK, url));
        const auto told = handed.find(calls.size());
        accessor(told != handed.end() ? told->second : url);
        return calls.size() != failingCall || fail(error, makePOSIXError(EDEADLK, url));
    }
    void itemDidMove(const URL& from, const URL& to) override { moves.emplace_back(from, to); }

    std::vector<Call> calls;
    std::vector<std::pair<URL, URL>> moves;
    std::size_t refusedCall = 0;  ///< fails before the write
    std::size_t failingCall = 0;  ///< fails behind the write
    std::map<std::size_t, std::optional<URL>> handed;
};

}  // namespace parvel::testing
