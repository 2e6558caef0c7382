// The least that expanding a zip file costs: expand LIST INTO inflates each entry, checks it, and
// writes it below a folder of its own.

#include <unordered_set>

#include "bench/Runner.h"
#include "bench/floor/Zip.h"

namespace {

using parvel::bench::Zip;

class Folder {
public:
    explicit Folder(std::string path) : m_path(std::move(path)) {}

    bool write(std::string_view name, const std::string& content) {
        const std::size_t slash = name.rfind('/');
        if (slash != std::string_view::npos && m_made.emplace(name.substr(0, slash)).second)
            std::filesystem::create_directories(m_path + "/" + std::string(name.substr(0, slash)));
        const int file = open((m_path + "/" + std::string(name)).c_str(),
                              O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
        const bool isWritten =
            ::write(file, content.data(), content.size()) == static_cast<ssize_t>(content.size());
        return close(file) == 0 && isWritten;
    }

private:
    std::string m_path;
    std::unordered_set<std::string> m_made;
};

}  // namespace

int main(int argumentCount, char** argumentWords) {
    std::string content;
    const auto expand = [&content](const std::string& path, const std::string& into) {
        Folder folder(into);
        Zip zip(path);
        return zip.readDirectory() && !zip.visit([&](const Zip::Entry& entry) {
            const bool isFolder = entry.name.ends_with('/');
            return !isFolder && (!zip.read(entry, content) || !folder.write(entry.name, content));
        });
    };
    return parvel::bench::runInto(parvel::bench::argumentsOf(argumentCount, argumentWords), expand);
}
