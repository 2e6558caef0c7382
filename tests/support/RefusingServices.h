#pragma once

#include <cerrno>
#include <functional>
#include <utility>

#include "parvel/platform/FileSystemService.h"
#include "parvel/platform/FileWriter.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// The host's service, but what it is told to refuse fails with EIO and the item's URL.
class RefusingFileSystem : public ForwardingFileSystemService {
public:
    enum class Act { Move, Replace, Copy, Remove };
    /// Asked with the act and the URL that it starts from.
    using Refusal = std::function<bool(Act, const URL&)>;

    explicit RefusingFileSystem(Refusal refuses)
        : ForwardingFileSystemService(FileSystemService::makeDefault()),
          m_refuses(std::move(refuses)) {}

    bool moveItem(const URL& source, const URL& destination, ErrorOut error) override {
        return allows(Act::Move, source, error) &&
               ForwardingFileSystemService::moveItem(source, destination, error);
    }
    bool replaceItem(const URL& existing, const URL& replacement, ReplaceOptions options,
                     std::optional<URL>* resulting, ErrorOut error) override {
        return allows(Act::Replace, replacement, error) &&
               ForwardingFileSystemService::replaceItem(existing, replacement, options, resulting,
                                                        error);
    }
    bool copyItem(const URL& source, const URL& destination, ErrorOut error) override {
        return allows(Act::Copy, source, error) &&
               ForwardingFileSystemService::copyItem(source, destination, error);
    }
    bool removeItem(const URL& item, ErrorOut error) override {
        return allows(Act::Remove, item, error) &&
               ForwardingFileSystemService::removeItem(item, error);
    }

private:
    bool allows(Act act, const URL& url, ErrorOut error) {
        return !m_refuses(act, url) || fail(error, makePOSIXError(EIO, url));
    }

    Refusal m_refuses;
};

/// Refuses to write any file, with EIO and the file's URL, in force while it lives.
class RefusingFileWriter : public FileWriter {
public:
    bool writeFile(const URL& url, const Data&, ErrorOut error) override {
        return fail(error, makePOSIXError(EIO, url));
    }

private:
    Service<FileWriter>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
