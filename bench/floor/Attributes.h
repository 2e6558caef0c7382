#pragma once

#include <sys/xattr.h>

#include <cstring>
#include <string_view>

namespace parvel::bench {

/// Reads what extended attributes an open file has, one listing and then each by name, and tells
/// whether one of them is the stored identity.
inline bool readAttributes(int file) {
    constexpr std::string_view identity = "user.com.kestrel.Folium.assetID";
    char names[1024];
    char value[1024];
    bool hasIdentity = false;
    const ssize_t length = flistxattr(file, names, sizeof names);
    for (ssize_t at = 0; at < length; at += static_cast<ssize_t>(std::strlen(names + at)) + 1) {
        const bool isRead = fgetxattr(file, names + at, value, sizeof value) > 0;
        hasIdentity = hasIdentity || (isRead && names + at == identity);
    }
    return hasIdentity;
}

}  // namespace parvel::bench
