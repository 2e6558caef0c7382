#pragma once

#include <memory>
#include <utility>

#include "parvel/filemanager/PVAssetMetadataFileManager.h"

namespace parvel::cli {

/// Another file-system service in a manager, while it lives.
class ServiceInPlace {
public:
    ServiceInPlace(PVAssetMetadataFileManager& manager, std::shared_ptr<FileSystemService> service)
        : m_manager(manager), m_before(manager.fileManager()) {
        manager.setFileManager(std::move(service));
    }
    ~ServiceInPlace() { m_manager.setFileManager(m_before); }
    ServiceInPlace(const ServiceInPlace&) = delete;
    ServiceInPlace& operator=(const ServiceInPlace&) = delete;

private:
    PVAssetMetadataFileManager& m_manager;
    std::shared_ptr<FileSystemService> m_before;
};

}  // namespace parvel::cli
