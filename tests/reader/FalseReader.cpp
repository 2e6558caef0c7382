// A helper program that breaks the protocol. What it does wrong is its own name, the last part of
// the path that it was started by; a sound reply is given where that says nothing else.

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cstring>
#include <limits>
#include <string>

#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::reader {
namespace {

/// Of the request that is answered.
std::uint32_t number = 0;

/// With `count` descriptors of the file.
void say(const Reply& reply, const std::string& text = "", int file = -1,
         std::size_t headerSize = sizeof(Reply), std::size_t count = 1) {
    Reply header = reply;
    header.number = number;
    std::array<iovec, 2> parts{iovec{&header, headerSize},
                               iovec{const_cast<char*>(text.data()), text.size()}};
    msghdr message{};
    message.msg_iov = parts.data();
    message.msg_iovlen = parts.size();
    const std::array<int, 2> files{file, file};
    alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof files)> space{};
    if (file >= 0) {
        message.msg_control = space.data();
        message.msg_controllen = CMSG_SPACE(count * sizeof file);
        cmsghdr* control = CMSG_FIRSTHDR(&message);
        control->cmsg_level = SOL_SOCKET;
        control->cmsg_type = SCM_RIGHTS;
        control->cmsg_len = CMSG_LEN(count * sizeof file);
        std::memcpy(CMSG_DATA(control), files.data(), count * sizeof file);
    }
    ::sendmsg(socketDescriptor, &message, MSG_NOSIGNAL);
}

bool hear(Request& request) {
    const bool isHeard = ::recv(socketDescriptor, &request, sizeof request, 0) == sizeof request;
    number = request.number;
    return isHeard;
}

int memoryFile(std::size_t size, bool isSealed) {
    const int file = ::memfd_create("pixels", MFD_ALLOW_SEALING);
    if (::ftruncate(file, static_cast<off_t>(size)) != 0)
        return -1;
    if (isSealed)
        ::fcntl(file, F_ADD_SEALS, F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE);
    return file;
}

void sayInformation(const std::string& fault) {
    Reply reply;
    reply.outcome = Outcome::Done;
    reply.pageCount = 1;
    std::string text = "Ann";
    reply.authorSize = 3;
    if (fault == "long-text")
        reply.authorSize = 4;
    if (fault == "much-text")
        text += "more";
    if (fault == "no-utf8")
        text = "\xFFnn";
    if (fault == "endless-date") {
        reply.hasCreationDate = 1;
        reply.creationDate = std::numeric_limits<double>::infinity();
    }
    if (fault == "short")
        return say(reply, "", -1, 8);
    say(reply, text);
}

void sayPage(const std::string& fault) {
    Reply reply;
    reply.outcome = Outcome::Done;
    reply.hasFirstPage = 1;
    reply.cropBoxWidth = 10;
    reply.cropBoxHeight = fault == "no-number" ? std::numeric_limits<double>::quiet_NaN() : 10;
    say(reply);
}

void sayPixels(const std::string& fault, const Request& request) {
    Reply reply;
    reply.outcome = Outcome::Done;
    reply.width = request.width + (fault == "wrong-size" ? 1 : 0);
    reply.height = request.height;
    reply.stride = reply.width * 4 - (fault == "small-stride" ? 4 : 0);
    reply.size = std::uint64_t{reply.stride} * reply.height;
    if (fault == "no-file")
        return say(reply);
    say(reply, "", memoryFile(reply.size - (fault == "small-file" ? 1 : 0), fault != "unsealed"),
        sizeof(Reply), fault == "two-files" ? 2 : 1);
}

int run(const std::string& fault) {
    if (fault == "exits")
        return 0;
    Reply hello;
    hello.outcome = Outcome::Hello;
    hello.version = fault == "other-version" ? version + 1 : version;
    say(hello);
    Request request;
    while (hear(request)) {
        if (fault == "ends")
            return 0;
        if (fault == "hangs")
            ::pause();
        if (fault == "other-number")
            ++number;
        if (request.ask == Ask::OpenDocument)
            sayInformation(fault);
        else if (request.ask == Ask::DescribePage && fault == "ends-over-page")
            return 0;
        else if (request.ask == Ask::DescribePage)
            sayPage(fault);
        else if (request.ask == Ask::DrawPage)
            sayPixels(fault, request);
        else
            return 0;
    }
    return 0;
}

}  // namespace
}  // namespace parvel::reader

int main(int, char** arguments) {
    const std::string path = arguments[0];
    return parvel::reader::run(path.substr(path.rfind('/') + 1));
}
