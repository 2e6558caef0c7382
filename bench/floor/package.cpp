// The least that an expanded book costs: the extended attributes, each document opened, read and
// checked, the package document's MD5.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "bench/Runner.h"
#include "bench/floor/Attributes.h"
#include "bench/floor/Documents.h"

namespace {

bool readMember(int folder, const std::string& name, std::string& content) {
    const int file = openat(folder, name.c_str(), O_RDONLY | O_CLOEXEC);
    struct stat status {};
    if (file < 0 || fstat(file, &status) != 0)
        return false;
    content.resize(static_cast<std::size_t>(status.st_size));
    const bool isRead = read(file, content.data(), content.size()) == status.st_size;
    close(file);
    return isRead;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    using namespace parvel::bench;
    return runOver(argumentsOf(argumentCount, argumentWords), [](const std::string& path) {
        const int folder = open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
        if (folder < 0)
            return false;
        readAttributes(folder);
        const bool isRead = readDocuments([folder](const std::string& name, std::string& document) {
            return readMember(folder, name, document);
        });
        close(folder);
        return isRead;
    });
}
