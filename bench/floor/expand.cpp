// The least that expanding a zip file costs: expand LIST INTO reads the entries in turn, inflates
// and checks each, and writes it below a folder of its own.

#include <map>

#include "bench/Runner.h"
#include "bench/floor/Zip.h"

namespace {

using parvel::bench::Zip;

/// A folder and those below it, which stay open.
class Folder {
public:
    explicit Folder(const std::string& path)
        : m_root(open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC)) {}
    ~Folder() {
        for (const auto& [path, folder] : m_below)
            close(folder);
        close(m_root);
    }
    Folder(const Folder&) = delete;
    Folder& operator=(const Folder&) = delete;

    bool write(std::string_view name, const void* content, std::size_t size) {
        const std::size_t slash = name.rfind('/');
        const bool isAtTop = slash == std::string_view::npos;
        const std::string last(isAtTop ? name : name.substr(slash + 1));
        const int file = openat(isAtTop ? m_root : below(name.substr(0, slash)), last.c_str(),
                                O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
        const bool isWritten = ::write(file, content, size) == static_cast<ssize_t>(size);
        return close(file) == 0 && isWritten;
    }

private:
    int below(std::string_view path) {
        const auto known = m_below.find(path);
        if (known != m_below.end())
            return known->second;
        const std::size_t slash = path.rfind('/');
        const bool isAtTop = slash == std::string_view::npos;
        const int above = isAtTop ? m_root : below(path.substr(0, slash));
        const std::string last(isAtTop ? path : path.substr(slash + 1));
        mkdirat(above, last.c_str(), 0700);
        const int made = openat(above, last.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC);
        return m_below.emplace(path, made).first->second;
    }

    int m_root;
    std::map<std::string, int, std::less<>> m_below;
};

/// Gives entries in the order of their offsets, several with each read.
class Entries {
public:
    explicit Entries(const Zip& zip) : m_zip(zip) {
        zip.visit([this](const Zip::Entry& entry) {
            m_entries.push_back(entry);
            return false;
        });
    }

    template <class Take>
    bool giveAll(Take&& take) {
        for (std::size_t at = 0; at < m_entries.size(); ++at) {
            const Zip::Entry& entry = m_entries[at];
            if (entry.name.ends_with('/'))
                continue;
            const std::uint8_t* content = contentOf(at);
            if (!content || !Zip::isWhole(entry, content) || !take(entry, content))
                return false;
        }
        return true;
    }

private:
    static constexpr std::size_t kReadAtOnce = 256 << 10;

    static std::size_t endOf(const Zip::Entry& entry) {
        return entry.offset + Zip::lengthOf(entry);
    }

    static std::uint8_t* room(std::unique_ptr<std::uint8_t[]>& bytes, std::size_t& size,
                              std::size_t wanted) {
        if (wanted > size)
            bytes = std::make_unique_for_overwrite<std::uint8_t[]>(size = wanted);
        return bytes.get();
    }

    const std::uint8_t* contentOf(std::size_t at) {
        const Zip::Entry& entry = m_entries[at];
        const std::size_t start = entry.offset;
        if (endOf(entry) > m_end) {
            std::size_t end = endOf(entry);
            while (++at < m_entries.size() && endOf(m_entries[at]) - start <= kReadAtOnce)
                end = endOf(m_entries[at]);
            std::uint8_t* piece = room(m_piece, m_pieceSize, end - start);
            m_start = start;
            m_end = start + m_zip.readPiece(piece, end - start, start);
        }
        const std::uint8_t* data = Zip::dataBehind(m_piece.get() + (start - m_start));
        if (data + entry.stored > m_piece.get() + (m_end - m_start))
            return nullptr;
        if (entry.method == 0)
            return data;
        std::uint8_t* content = room(m_content, m_contentSize, entry.size);
        return Zip::inflate(entry, data, content) ? content : nullptr;
    }

    const Zip& m_zip;
    std::vector<Zip::Entry> m_entries;
    std::unique_ptr<std::uint8_t[]> m_piece;
    std::size_t m_pieceSize = 0;
    std::size_t m_start = 0;
    std::size_t m_end = 0;
    std::unique_ptr<std::uint8_t[]> m_content;
    std::size_t m_contentSize = 0;
};

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto expand = [](const std::string& path, const std::string& into) {
        Folder folder(into);
        Zip zip(path);
        return zip.readDirectory() &&
               Entries(zip).giveAll([&](const Zip::Entry& entry, const std::uint8_t* content) {
                   return folder.write(entry.name, content, entry.size);
               });
    };
    return parvel::bench::runInto(parvel::bench::argumentsOf(argumentCount, argumentWords), expand);
}
