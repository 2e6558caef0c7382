#pragma once

#include <string>
#include <vector>

#include "parvel/platform/FileSystemService.h"

namespace parvel::testing {

/// The host's service, which keeps a line of each call, its arguments as paths.
class RecordingFileSystem : public ForwardingFileSystemService {
public:
    RecordingFileSystem() : ForwardingFileSystemService(FileSystemService::makeDefault()) {}

    bool itemExistsAtPath(const std::string& path) override {
        calls.push_back("exists " + path);
        return ForwardingFileSystemService::itemExistsAtPath(path);
    }
    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        calls.push_back("move " + source.path() + " to " + destination.path());
        return ForwardingFileSystemService::moveItem(source, destination, error);
    }
    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        calls.push_back("replace " + existing.path() + " by " + replacement.path() + " options " +
                        std::to_string(static_cast<int>(options)) +
                        (resulting ? " asking for the place" : ""));
        return ForwardingFileSystemService::replaceItem(existing, replacement, options, resulting,
                                                        error);
    }
    bool removeItem(const URL& item, ErrorOut error) override {
        calls.push_back("remove " + item.path());
        return ForwardingFileSystemService::removeItem(item, error);
    }
    bool trashItem(const URL& item, std::optional<URL>* resulting, ErrorOut error) override {
        calls.push_back("trash " + item.path());
        return ForwardingFileSystemService::trashItem(item, resulting, error);
    }
    bool setUbiquitous(bool ubiquitous, const URL& item, const URL& destination,
                       ErrorOut error) override {
        calls.push_back((ubiquitous ? "in " : "out ") + item.path() + " to " + destination.path());
        return ForwardingFileSystemService::setUbiquitous(ubiquitous, item, destination, error);
    }

    std::vector<std::string> calls;
};

}  // namespace parvel::testing
