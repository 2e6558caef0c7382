#pragma once

#include <cstddef>
#include <cstdint>

/// What the library and its confined helper program, parvel-reader, say to each other over a Unix
/// socket of type SOCK_SEQPACKET. The library asks, the helper answers each request with one reply;
/// the first reply comes unasked and says that the helper stands behind its walls (Hello). The
/// helper ends when the library's end is closed, and on any request that it can't make sense of.
///
/// Both ends are built from the same sources on the same host, so the structures go as they are.
/// The library trusts nothing in a reply all the same.
namespace parvel::reader {

/// The helper is started as `parvel-reader BYTES [fonts]`: the address space that it may have for
/// input beyond its own, and whether it makes the host's fonts ready, which takes a while. Its
/// socket is inherited under this descriptor.
inline constexpr int socketDescriptor = 3;
inline constexpr const char* fontsArgument = "fonts";

/// Raised with every change to what follows; Hello carries it.
inline constexpr std::uint32_t version = 2;

enum class Ask : std::uint32_t {
    /// With the document's descriptor. Takes the place of a document that is open. Answered with
    /// the information and, behind the header, the author's and then the subject's UTF-8 text.
    OpenDocument = 1,
    /// Draws the first page of the open document, `width` by `height`. Answered with pixels, or
    /// with FontsWanted.
    DrawPage = 2,
    /// Closes the open document, if any, and unmaps its file. The one request that is not answered.
    CloseDocument = 3,
    /// With the descriptor of an encoded image of `size` bytes. Answered with pixels.
    DecodeImage = 4,
    /// Answered with what is known of the first page of the open document.
    DescribePage = 5,
};

struct Request {
    Ask ask{};
    std::uint32_t number = 0;  ///< counts the requests
    std::uint32_t width = 0;
    std::uint32_t height = 0;
    std::uint32_t stride = 0;
    /// DrawPage: what a helper without fonts has spent on the page already.
    std::uint32_t spentMilliseconds = 0;
    std::uint64_t size = 0;
};

enum class Outcome : std::uint32_t {
    Done = 1,
    /// The input is damaged, of no known kind or over a limit. Nothing else in the reply counts.
    Refused = 2,
    Hello = 3,
    /// The page needs a font, or another file of the host, that this helper was not started with.
    /// It ends behind this reply, which tells the CPU time spent.
    FontsWanted = 4,
};

/// What Hello says of the walls.
enum Wall : std::uint32_t {
    WallSeccomp = 1,
    WallLandlock = 2,
};

/// A text that is missing, which is not the same as an empty one.
inline constexpr std::uint32_t noText = 0xffffffff;
/// The longest text; a longer one counts as missing.
inline constexpr std::size_t longestText = 64 * 1024;

/// Pixels come with one descriptor, of a memory file sealed against any change: `size` bytes, which
/// are `height` rows of `stride` bytes, as Image.h has them.
struct Reply {
    Outcome outcome{};
    std::uint32_t number = 0;   ///< the request's; 0 for Hello
    std::uint32_t version = 0;  ///< Hello
    std::uint32_t walls = 0;    ///< Hello: the walls that stand

    std::uint32_t isLocked = 0;
    std::uint32_t pageCount = 0;
    std::uint32_t hasFirstPage = 0;
    std::int32_t rotation = 0;
    std::uint32_t hasCreationDate = 0;
    std::uint32_t hasModificationDate = 0;
    std::uint32_t authorSize = noText;
    std::uint32_t subjectSize = noText;

    std::uint32_t width = 0;
    std::uint32_t height = 0;
    std::uint32_t stride = 0;
    std::uint32_t spentMilliseconds = 0;  ///< FontsWanted
    std::uint64_t size = 0;

    double cropBoxWidth = 0;
    double cropBoxHeight = 0;
    double creationDate = 0;      ///< seconds since 2001-01-01 00:00:00 UTC
    double modificationDate = 0;  ///< the same
};

/// The longest side of a page that is drawn.
inline constexpr std::uint32_t longestDrawnSide = 16384;

/// The CPU time that may go into all information of a document, into the drawing of a page (a list
/// of covers waits for no one longer than that) and into the decoding of an image. And the longest
/// wait for a reply.
inline constexpr int informationMilliseconds = 1500;
inline constexpr int drawingMilliseconds = 1200;
inline constexpr int decodingMilliseconds = 5000;
inline constexpr int longestWaitMilliseconds = 10000;
/// Address space beyond the input's own bytes, and what a helper gets for the input unless that is
/// longer.
inline constexpr std::uint64_t addressSpace = 256ULL << 20;
inline constexpr std::uint64_t ordinaryInput = 64ULL << 20;
/// The longest input that the helper copies at once. Nothing of its file is held then, so that such
/// a document need not be closed.
inline constexpr std::uint64_t longestCopied = 256ULL << 10;
/// The longest input that is mapped: the PDF library counts mapped bytes in an int. A longer
/// document is read piece by piece.
inline constexpr std::uint64_t longestMapped = 0x7fffffff;

}  // namespace parvel::reader
