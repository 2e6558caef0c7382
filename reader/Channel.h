#pragma once

#include <string>

#include "parvel/platform/linux/FileDescriptor.h"
#include "parvel/platform/linux/ReaderProtocol.h"

namespace parvel::reader {

/// A request as it came, with the descriptor that came with it, if any.
struct Received {
    Request request;
    host::FileDescriptor input;
};

/// What is sent back: the header, a text behind it, and a descriptor where it is open.
struct Answer {
    Reply reply;
    std::string text;
    host::FileDescriptor file;
};

/// The answer to an input that can't be read.
[[nodiscard]] Answer refusal();

/// Waits for a request. False at the end of the conversation, and for what is no request.
[[nodiscard]] bool receive(Received& received);
/// Callable from a signal handler where the answer holds no text.
[[nodiscard]] bool send(Answer& answer);

}  // namespace parvel::reader
