#pragma once

#include <memory>

#include "parvel/platform/linux/RehearsedDisk.h"

namespace parvel::host {

/// The services that read, write and copy files' content, over a rehearsed disk: a file is read
/// where it really lies, one that would be written only takes its name. Packages are really made,
/// in a folder of the system's temporary directory that goes with the last of these services, so
/// that a rehearsal tells what a damaged archive would come to. In force while it lives.
class RehearsedContent {
public:
    explicit RehearsedContent(std::shared_ptr<RehearsedDisk> disk);
    ~RehearsedContent();
    RehearsedContent(const RehearsedContent&) = delete;
    RehearsedContent& operator=(const RehearsedContent&) = delete;

private:
    struct Services;
    std::unique_ptr<Services> m_services;
};

}  // namespace parvel::host
