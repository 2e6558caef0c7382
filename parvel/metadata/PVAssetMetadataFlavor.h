#pragma once

#include <cstdint>

namespace parvel {

/// The dictionary representations of a record, each cut for one consumer.
enum PVAssetMetadataFlavor : std::int64_t {
    PVAssetMetadataFlavorFull = 0,            ///< dictionaryRepresentation
    PVAssetMetadataFlavorContentLibrary = 1,  ///< contentLibraryRepresentation
    PVAssetMetadataFlavorBazaarMetadata = 2,  ///< bazaarMetadataRepresentation
    PVAssetMetadataFlavorProgress = 3,        ///< progressRepresentation
    PVAssetMetadataFlavorIdentity = 4,        ///< identityRepresentation
};

}  // namespace parvel
