#include "reader/Channel.h"

#include <sys/socket.h>

#include <array>
#include <cstring>

#include "parvel/platform/linux/SystemCall.h"

namespace parvel::reader {

namespace {

/// Room for the one descriptor that goes with a message.
union DescriptorSpace {
    cmsghdr header;
    std::array<char, CMSG_SPACE(sizeof(int))> bytes;
};

}  // namespace

Answer refusal() {
    Answer answer;
    answer.reply.outcome = Outcome::Refused;
    return answer;
}

bool receive(Received& received) {
    iovec part{&received.request, sizeof received.request};
    DescriptorSpace space;
    msghdr message{};
    message.msg_iov = &part;
    message.msg_iovlen = 1;
    message.msg_control = space.bytes.data();
    message.msg_controllen = space.bytes.size();
    const ssize_t count =
        host::retried([&] { return ::recvmsg(socketDescriptor, &message, MSG_CMSG_CLOEXEC); });
    const cmsghdr* header = count > 0 ? CMSG_FIRSTHDR(&message) : nullptr;
    if (header && header->cmsg_type == SCM_RIGHTS && header->cmsg_len == CMSG_LEN(sizeof(int))) {
        int descriptor = -1;
        std::memcpy(&descriptor, CMSG_DATA(header), sizeof descriptor);
        received.input = host::FileDescriptor(descriptor);
    }
    return count == static_cast<ssize_t>(sizeof received.request) &&
           (message.msg_flags & (MSG_TRUNC | MSG_CTRUNC)) == 0;
}

bool send(Answer& answer) {
    std::array<iovec, 2> parts{iovec{&answer.reply, sizeof answer.reply},
                               iovec{answer.text.data(), answer.text.size()}};
    msghdr message{};
    message.msg_iov = parts.data();
    message.msg_iovlen = parts.size();
    DescriptorSpace space;
    if (answer.file) {
        const int descriptor = answer.file.get();
        space.bytes.fill(0);
        message.msg_control = space.bytes.data();
        message.msg_controllen = space.bytes.size();
        cmsghdr* header = CMSG_FIRSTHDR(&message);
        header->cmsg_level = SOL_SOCKET;
        header->cmsg_type = SCM_RIGHTS;
        header->cmsg_len = CMSG_LEN(sizeof descriptor);
        std::memcpy(CMSG_DATA(header), &descriptor, sizeof descriptor);
    }
    return host::retried([&] { return ::sendmsg(socketDescriptor, &message, MSG_NOSIGNAL); }) >= 0;
}

}  // namespace parvel::reader
