// libarchive: libarchive LIST INTO expands each archive into a folder of its own below INTO.

#include <archive.h>
#include <archive_entry.h>

#include "bench/Runner.h"

namespace {

constexpr std::size_t kBlockSize = 64 << 10;

bool copyContent(archive* from, archive* to) {
    const void* bytes = nullptr;
    std::size_t size = 0;
    la_int64_t offset = 0;
    while (archive_read_data_block(from, &bytes, &size, &offset) == ARCHIVE_OK) {
        if (archive_write_data_block(to, bytes, size, offset) < ARCHIVE_OK)
            return false;
    }
    return archive_write_finish_entry(to) == ARCHIVE_OK;
}

bool expand(const std::string& path, const std::string& folder) {
    archive* from = archive_read_new();
    archive_read_support_format_zip(from);
    archive* to = archive_write_disk_new();
    archive_write_disk_set_options(
        to, ARCHIVE_EXTRACT_SECURE_NODOTDOT | ARCHIVE_EXTRACT_SECURE_SYMLINKS);
    bool isGood = archive_read_open_filename(from, path.c_str(), kBlockSize) == ARCHIVE_OK;
    archive_entry* entry = nullptr;
    while (isGood && archive_read_next_header(from, &entry) == ARCHIVE_OK) {
        archive_entry_set_pathname(entry, (folder + "/" + archive_entry_pathname(entry)).c_str());
        isGood = archive_write_header(to, entry) == ARCHIVE_OK && copyContent(from, to);
    }
    archive_write_free(to);
    archive_read_free(from);
    return isGood;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    return parvel::bench::runInto(parvel::bench::argumentsOf(argumentCount, argumentWords), expand);
}
