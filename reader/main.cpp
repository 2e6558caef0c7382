// parvel-reader BYTES [fonts]: parses PDF documents and images for libParvelFoundation behind walls
// of the system. Started by the library alone; what the two say is in ReaderProtocol.h.
//
//   1. what needs files of the host is made ready;
//   2. the walls go up, and Hello says which stand;
//   3. requests are answered one after the other, until the library closes its end.

#include <malloc.h>

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <string_view>

#include "reader/Channel.h"
#include "reader/DecodedImage.h"
#include "reader/Document.h"
#include "reader/Fonts.h"
#include "reader/HostFiles.h"
#include "reader/Input.h"
#include "reader/Walls.h"

namespace parvel::reader {
namespace {

/// Tables for the scripts of East Asia, where they are installed.
constexpr const char* tablesFolder = "/usr/share/poppler";

/// What is left of the time for drawing, though never nothing, which would be no limit.
int drawingTime(const Request& request) {
    const auto limit = static_cast<std::uint32_t>(drawingMilliseconds);
    return static_cast<int>(limit - std::min(request.spentMilliseconds, limit - 1));
}

void readyHostFiles() {
    readyFonts();
    keepHostFolder(tablesFolder);
}

/// What one document needed serves the next: to hand it back to the system and have it again, page
/// by page, would cost more than the drawing of a simple page.
void keepFreedMemory() {
    constexpr int mostKept = 32 << 20;
    ::mallopt(M_MMAP_THRESHOLD, mostKept);
    ::mallopt(M_TRIM_THRESHOLD, mostKept);
}

class Reader {
public:
    explicit Reader(bool hasFonts) : m_hasFonts(hasFonts) {}

    /// False for a request that makes no sense, and when nobody hears the answer.
    bool serve(Received& received) {
        if (received.request.ask == Ask::CloseDocument) {
            m_document.close();
            return true;
        }
        // A document that is open stays mapped while something else is asked.
        allowAddressSpace(Input::mappedSize(received.request.size) + m_document.mappedSize());
        Answer answer;
        const bool isAnswered = makeAnswer(received, answer);
        answer.reply.number = received.request.number;
        // Whoever hears the answer finds the file no longer open, unless the document needs it.
        received.input = host::FileDescriptor();
        return isAnswered && send(answer);
    }

private:
    bool makeAnswer(const Received& received, Answer& answer) {
        switch (received.request.ask) {
            case Ask::OpenDocument:
                limitProcessorTime(informationMilliseconds);
                answer = m_document.open(received);
                return true;
            case Ask::DescribePage:
                answer = m_document.describePage();
                return true;
            case Ask::DrawPage: {
                limitProcessorTime(drawingTime(received.request));
                const EndWhenFileIsWanted inForce(m_hasFonts ? nullptr : &received.request);
                answer = m_document.drawPage(received.request);
                return true;
            }
            case Ask::DecodeImage:
                limitProcessorTime(decodingMilliseconds);
                answer = decodedImage(received);
                return true;
            default:
                return false;
        }
    }

    bool m_hasFonts;
    Document m_document;
};

int run(std::uint64_t inputBytes, bool hasFonts) {
    keepFreedMemory();
    // The C library looks a time zone up in the host's files, once.
    ::setenv("TZ", "UTC0", 1);
    ::tzset();
    if (hasFonts)
        readyHostFiles();
    Reader reader(hasFonts);
    answerTrappedCalls();

    Answer hello;
    hello.reply.outcome = Outcome::Hello;
    hello.reply.version = version;
    hello.reply.walls = raiseWalls(inputBytes);
    bool isGoingOn = send(hello);
    while (isGoingOn) {
        Received received;
        isGoingOn = receive(received) && reader.serve(received);
    }
    return EXIT_SUCCESS;
}

}  // namespace
}  // namespace parvel::reader

int main(int argc, char** argv) {
    if (argc < 2)
        return EXIT_FAILURE;
    const std::uint64_t inputBytes = std::strtoull(argv[1], nullptr, 10);
    const bool hasFonts = argc > 2 && std::string_view(argv[2]) == parvel::reader::fontsArgument;
    return parvel::reader::run(inputBytes, hasFonts);
}
