// The least that a tagged audio file costs: one open, the extended attributes, the headers down to
// the tags, the tags in one read.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>

#include "bench/Runner.h"
#include "bench/floor/Attributes.h"

namespace {

std::uint64_t get(const unsigned char* bytes, int count) {
    std::uint64_t value = 0;
    for (int i = 0; i < count; ++i)
        value = value << 8 | bytes[i];
    return value;
}

/// Where an atom's content begins and ends, sought among its siblings.
bool find(int file, const char* name, std::uint64_t& begin, std::uint64_t& end) {
    unsigned char header[16];
    for (std::uint64_t at = begin; at + 8 <= end;) {
        if (pread(file, header, sizeof header, static_cast<off_t>(at)) < 8)
            return false;
        std::uint64_t size = get(header, 4);
        const std::uint64_t skip = size == 1 ? 16 : 8;
        if (size == 1)
            size = get(header + 8, 8);
        if (size == 0)
            size = end - at;
        if (size < skip || size > end - at)
            return false;
        if (std::memcmp(header + 4, name, 4) == 0) {
            begin = at + skip;
            end = at + size;
            return true;
        }
        at += size;
    }
    return false;
}

bool readTags(const std::string& path) {
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC);
    struct stat status {};
    if (file < 0 || fstat(file, &status) != 0)
        return false;
    parvel::bench::readAttributes(file);
    std::uint64_t begin = 0;
    auto end = static_cast<std::uint64_t>(status.st_size);
    bool found = find(file, "moov", begin, end) && find(file, "udta", begin, end) &&
                 find(file, "meta", begin, end);
    if (found) {
        begin += 4;
        found = find(file, "ilst", begin, end);
    }
    if (found) {
        std::vector<unsigned char> tags(std::min<std::uint64_t>(end - begin, 1 << 20));
        found = pread(file, tags.data(), tags.size(), static_cast<off_t>(begin)) > 0;
    }
    close(file);
    return found;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    return parvel::bench::runOver(arguments, readTags);
}
