// The tags of an MP4 file stand in moov/udta/meta/ilst or moov/meta/ilst: one atom an item, its
// value in the item's first "data" atom. Only atom heads are read on the way there, through a small
// window.

#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <memory>
#include <string_view>

#include "parvel/platform/MediaTags.h"
#include "parvel/platform/TextRules.h"
#include "parvel/platform/linux/OpenItem.h"
#include "parvel/platform/linux/SystemCall.h"

namespace parvel {

namespace {

constexpr std::uint64_t kTextLimit = 1ULL << 20;
/// Titles and names are shorter.
constexpr std::size_t kShortValue = 1024;
constexpr std::size_t kFirstWindow = 4096;
constexpr std::size_t kLargestWindow = 65536;

constexpr std::uint32_t atomName(const char (&name)[5]) {
    return static_cast<std::uint32_t>(static_cast<unsigned char>(name[0])) << 24 |
           static_cast<std::uint32_t>(static_cast<unsigned char>(name[1])) << 16 |
           static_cast<std::uint32_t>(static_cast<unsigned char>(name[2])) << 8 |
           static_cast<std::uint32_t>(static_cast<unsigned char>(name[3]));
}

std::uint32_t bigEndian32(const std::uint8_t* bytes) {
    return static_cast<std::uint32_t>(bytes[0]) << 24 | static_cast<std::uint32_t>(bytes[1]) << 16 |
           static_cast<std::uint32_t>(bytes[2]) << 8 | bytes[3];
}

std::uint64_t bigEndian64(const std::uint8_t* bytes) {
    return static_cast<std::uint64_t>(bigEndian32(bytes)) << 32 | bigEndian32(bytes + 4);
}

/// Big-endian UTF-16 as UTF-8; none for an odd length or a lone surrogate.
std::optional<std::string> utf8FromUTF16(const std::string& bytes) {
    const auto unitAt = [&](std::size_t at) {
        return static_cast<std::uint32_t>(static_cast<unsigned char>(bytes[at])) << 8 |
               static_cast<unsigned char>(bytes[at + 1]);
    };
    if (bytes.size() % 2 != 0)
        return std::nullopt;
    std::string text;
    for (std::size_t at = 0; at < bytes.size(); at += 2) {
        std::uint32_t unit = unitAt(at);
        if (unit >= 0xD800 && unit <= 0xDFFF) {
            const bool hasLow =
                unit <= 0xDBFF && at + 2 < bytes.size() && (unitAt(at + 2) & 0xFC00) == 0xDC00;
            if (!hasLow)
                return std::nullopt;
            at += 2;
            unit = 0x10000 + ((unit - 0xD800) << 10) + (unitAt(at) - 0xDC00);
        }
        appendUTF8(text, unit);
    }
    return text;
}

/// A file seen through a window that grows while it is read in order.
class WindowedFile {
public:
    explicit WindowedFile(std::shared_ptr<const host::OpenItem> file) : m_file(std::move(file)) {}

    [[nodiscard]] std::uint64_t size() const {
        return static_cast<std::uint64_t>(m_file->status.st_size);
    }

    /// `length` bytes at an offset, at most a window's; null when the file has no such bytes. Good
    /// until the next call.
    const std::uint8_t* peek(std::uint64_t offset, std::size_t length) {
        if (!isInWindow(offset, length))
            fill(offset, length);
        return isInWindow(offset, length) ? m_window.get() + (offset - m_start) : nullptr;
    }

    /// Bytes of any length, whole or not at all.
    [[nodiscard]] bool read(std::uint64_t offset, std::uint8_t* bytes, std::uint64_t length) const {
        for (std::uint64_t at = 0; at < length;) {
            const ssize_t got = host::retried([&] {
                return ::pread(m_file->descriptor.get(), bytes + at, length - at,
                               static_cast<off_t>(offset + at));
            });
            if (got <= 0)
                return false;
            at += static_cast<std::uint64_t>(got);
        }
        return true;
    }

private:
    [[nodiscard]] bool isInWindow(std::uint64_t offset, std::size_t length) const {
        return offset >= m_start && offset + length <= m_start + m_length;
    }

    void fill(std::uint64_t offset, std::size_t length) {
        const bool isNext = offset >= m_start && offset <= m_start + m_length + 64;
        m_nextWindow = isNext ? std::min(m_nextWindow * 2, kLargestWindow) : kFirstWindow;
        const std::size_t wanted = std::max(length, m_nextWindow);
        if (wanted > m_capacity) {
            m_window = std::make_unique_for_overwrite<std::uint8_t[]>(wanted);
            m_capacity = wanted;
        }
        m_start = offset;
        const ssize_t got = host::retried([&] {
            return ::pread(m_file->descriptor.get(), m_window.get(), wanted,
                           static_cast<off_t>(offset));
        });
        m_length = got > 0 ? static_cast<std::size_t>(got) : 0;
    }

    std::shared_ptr<const host::OpenItem> m_file;
    std::uint64_t m_start = 0;
    std::size_t m_length = 0;
    std::size_t m_nextWindow = kFirstWindow;
    std::unique_ptr<std::uint8_t[]> m_window;
    std::size_t m_capacity = 0;
};

/// One atom's content.
struct Atom {
    std::uint32_t name;
    std::uint64_t begin;  ///< of the content
    std::uint64_t end;    ///< of the atom, at most its container's
    bool isCut;           ///< whether it claims more than its container has
};

/// The atom whose head stands at an offset of a container that ends at `end`; none for no sound
/// head.
std::optional<Atom> atomAt(WindowedFile& file, std::uint64_t offset, std::uint64_t end) {
    if (offset > end || end - offset < 8)
        return std::nullopt;
    const std::uint8_t* head = file.peek(offset, 8);
    if (!head)
        return std::nullopt;
    const std::uint32_t name = bigEndian32(head + 4);
    std::uint64_t size = bigEndian32(head);
    std::uint64_t headSize = 8;
    if (size == 1) {
        head = end - offset >= 16 ? file.peek(offset, 16) : nullptr;
        if (!head)
            return std::nullopt;
        size = bigEndian64(head + 8);
        headSize = 16;
    }
    if (size == 0)
        size = end - offset;  // to the end of what holds it
    if (size < headSize)
        return std::nullopt;
    const bool isCut = size > end - offset;
    return Atom{name, offset + headSize, isCut ? end : offset + size, isCut};
}

/// "meta" stands with four bytes of version and flags before its children, or without.
std::uint64_t metaChildren(WindowedFile& file, const Atom& meta) {
    const std::uint8_t* head = meta.end - meta.begin >= 8 ? file.peek(meta.begin, 8) : nullptr;
    const bool isPlain = head && bigEndian32(head + 4) == atomName("hdlr");
    return isPlain ? meta.begin : std::min(meta.begin + 4, meta.end);
}

class MP4Asset : public MediaAsset {
public:
    explicit MP4Asset(WindowedFile file) : m_file(std::move(file)) { findTags(); }

    std::optional<std::string> text(MediaTag tag) override {
        const std::optional<TagValue>& value = itemOf(tag).value;
        if (!value || value->size > kTextLimit)
            return std::nullopt;
        if (value->bytes)
            return textOf(tag, value->type, *value->bytes);
        std::string bytes(value->size, '\0');
        if (!m_file.read(value->offset, reinterpret_cast<std::uint8_t*>(bytes.data()), value->size))
            return std::nullopt;
        return textOf(tag, value->type, bytes);
    }

    std::optional<Data> bytes(MediaTag tag, std::uint64_t limit) override {
        const std::optional<TagValue>& value = itemOf(tag).value;
        if (!value || isTextType(value->type) || isIntegerType(value->type) || value->size > limit)
            return std::nullopt;
        auto buffer = std::make_unique_for_overwrite<std::uint8_t[]>(value->size);
        if (!m_file.read(value->offset, buffer.get(), value->size))
            return std::nullopt;
        return Data::adopt(std::move(buffer), value->size);
    }

private:
    static constexpr std::uint32_t kUTF8 = 1;
    static constexpr std::uint32_t kUTF16 = 2;
    static constexpr bool isTextType(std::uint32_t type) { return type == kUTF8 || type == kUTF16; }
    static constexpr bool isIntegerType(std::uint32_t type) {
        return type == 21 || type == 22 || (type >= 65 && type <= 67) || (type >= 74 && type <= 78);
    }

    struct TagValue {
        std::uint32_t type;
        std::uint64_t offset;
        std::uint64_t size;
        std::optional<std::string> bytes;  ///< of a short one that may be text
    };
    struct Item {
        bool isThere = false;
        std::optional<TagValue> value;
    };

    void findTags() {
        for (std::uint64_t at = 0;;) {
            const auto atom = atomAt(m_file, at, m_file.size());
            if (!atom)
                return;
            if (atom->name == atomName("moov"))
                return findTagsInMovie(*atom);
            at = atom->end;
        }
    }

    void findTagsInMovie(const Atom& movie) {
        forEachChild(movie.begin, movie.end, [&](const Atom& child) {
            if (child.name == atomName("meta"))
                findTagsInMeta(child);
            if (child.name != atomName("udta"))
                return;
            forEachChild(child.begin, child.end, [&](const Atom& below) {
                if (below.name == atomName("meta"))
                    findTagsInMeta(below);
            });
        });
    }

    void findTagsInMeta(const Atom& meta) {
        forEachChild(metaChildren(m_file, meta), meta.end, [&](const Atom& child) {
            if (child.name != atomName("ilst"))
                return;
            forEachChild(child.begin, child.end, [&](const Atom& item) { noteItem(item); });
        });
    }

    Item& itemOf(MediaTag tag) { return m_items[static_cast<std::size_t>(tag)]; }

    static std::optional<MediaTag> tagOf(std::uint32_t name) {
        switch (name) {
            case atomName("cnID"):
                return MediaTag::SongID;
            case atomName(
                "\xA9"
                "ART"):
                return MediaTag::Artist;
            case atomName(
                "\xA9"
                "nam"):
                return MediaTag::SongName;
            case atomName("covr"):
                return MediaTag::CoverArt;
            default:
                return std::nullopt;
        }
    }

    /// The first item of a key counts. A short value is taken while the window stands over it.
    void noteItem(const Atom& atom) {
        const std::optional<MediaTag> tag = tagOf(atom.name);
        if (!tag || itemOf(*tag).isThere)
            return;
        Item& item = itemOf(*tag);
        item.isThere = true;
        item.value = valueOf(atom);
        if (!item.value || *tag == MediaTag::CoverArt || item.value->size > kShortValue)
            return;
        const auto size = static_cast<std::size_t>(item.value->size);
        if (const std::uint8_t* bytes = m_file.peek(item.value->offset, size))
            item.value->bytes.emplace(reinterpret_cast<const char*>(bytes), size);
    }

    template <class Visitor>
    void forEachChild(std::uint64_t begin, std::uint64_t end, Visitor visit) {
        for (std::uint64_t at = begin; const auto atom = atomAt(m_file, at, end);) {
            visit(*atom);
            at = atom->end;
        }
    }

    /// The item's first "data" atom: four bytes of type, four of locale, the value.
    std::optional<TagValue> valueOf(const Atom& item) {
        for (std::uint64_t at = item.begin; const auto atom = atomAt(m_file, at, item.end);) {
            if (atom->name == atomName("data")) {
                const std::uint8_t* head =
                    atom->end - atom->begin >= 8 ? m_file.peek(atom->begin, 8) : nullptr;
                if (!head || atom->isCut)
                    return std::nullopt;
                return TagValue{bigEndian32(head) & 0xFFFFFF, atom->begin + 8,
                                atom->end - atom->begin - 8, std::nullopt};
            }
            at = atom->end;
        }
        return std::nullopt;
    }

    static std::optional<std::string> textOf(MediaTag tag, std::uint32_t type,
                                             const std::string& bytes) {
        const bool isInteger = isIntegerType(type) || (type == 0 && tag == MediaTag::SongID);
        if (isInteger)
            return integerText(bytes);
        if (type == kUTF16)
            return utf8FromUTF16(bytes);
        if (type == kUTF8 && isValidUTF8(bytes))
            return bytes;
        return std::nullopt;
    }

    /// Up to four bytes are unsigned, so that store IDs above 2^31 stay positive; eight are signed.
    static std::optional<std::string> integerText(const std::string& bytes) {
        if (bytes.empty() || (bytes.size() > 4 && bytes.size() != 8))
            return std::nullopt;
        std::uint64_t value = 0;
        for (const char byte : bytes)
            value = value << 8 | static_cast<unsigned char>(byte);
        return bytes.size() == 8 ? std::to_string(static_cast<std::int64_t>(value))
                                 : std::to_string(value);
    }

    WindowedFile m_file;
    std::array<Item, 4> m_items;  ///< one a tag, in their order
};

bool beginsLikeMP4(WindowedFile& file) {
    const std::uint8_t* head = file.peek(0, 8);
    if (!head)
        return false;
    static constexpr std::array known{atomName("ftyp"), atomName("moov"), atomName("mdat"),
                                      atomName("free"), atomName("skip"), atomName("wide")};
    return std::find(known.begin(), known.end(), bigEndian32(head + 4)) != known.end();
}

class MP4Tags : public MediaTags {
public:
    std::unique_ptr<MediaAsset> open(const URL& url) override {
        if (!url.isFileURL())
            return nullptr;
        auto file = host::heldOrOpened(url.path());
        if (!file || !S_ISREG(file->status.st_mode))
            return nullptr;
        WindowedFile window(std::move(file));
        if (!beginsLikeMP4(window))
            return nullptr;
        return std::make_unique<MP4Asset>(std::move(window));
    }
};

}  // namespace

MediaTags& MediaTags::host() {
    static MP4Tags tags;
    return tags;
}

}  // namespace parvel
