#include "parvel/platform/linux/cloud/ListenerOwner.h"

#include <netinet/in.h>
#include <unistd.h>

#include <cstring>

#include <gtest/gtest.h>

#include "parvel/platform/linux/FileDescriptor.h"

namespace parvel::testing {
namespace {

using host::FileDescriptor;
using host::isListenerTrusted;

sockaddr_storage address4(in_addr_t host, in_port_t port) {
    sockaddr_in made{};
    made.sin_family = AF_INET;
    made.sin_addr.s_addr = htonl(host);
    made.sin_port = port;
    sockaddr_storage address{};
    std::memcpy(&address, &made, sizeof made);
    return address;
}

sockaddr_storage address6(const in6_addr& host, in_port_t port) {
    sockaddr_in6 made{};
    made.sin6_family = AF_INET6;
    made.sin6_addr = host;
    made.sin6_port = port;
    sockaddr_storage address{};
    std::memcpy(&address, &made, sizeof made);
    return address;
}

/// A listener at a free port of an address; its port, in the network's order.
struct Listener {
    explicit Listener(sockaddr_storage address)
        : socket(::socket(address.ss_family, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
        socklen_t length =
            address.ss_family == AF_INET ? sizeof(sockaddr_in) : sizeof(sockaddr_in6);
        auto* const plain = reinterpret_cast<sockaddr*>(&address);
        if (::bind(socket.get(), plain, length) != 0 || ::listen(socket.get(), 1) != 0 ||
            ::getsockname(socket.get(), plain, &length) != 0)
            return;
        // Both kinds of address have the port at the same place.
        port = reinterpret_cast<const sockaddr_in*>(plain)->sin_port;
    }

    FileDescriptor socket;
    in_port_t port = 0;
};

TEST(ListenerOwner, AnOwnListenerIsTrusted) {
    const Listener listener(address4(INADDR_LOOPBACK, 0));

    EXPECT_TRUE(isListenerTrusted(address4(INADDR_LOOPBACK, listener.port)));
}

TEST(ListenerOwner, OneThatListensEverywhereIsTrustedOnTheLoopback) {
    const Listener listener(address4(INADDR_ANY, 0));

    EXPECT_TRUE(isListenerTrusted(address4(INADDR_LOOPBACK, listener.port)));
}

TEST(ListenerOwner, WhereNobodyListensNobodyIsTrusted) {
    in_port_t port = 0;
    { port = Listener(address4(INADDR_LOOPBACK, 0)).port; }

    EXPECT_FALSE(isListenerTrusted(address4(INADDR_LOOPBACK, port)));
}

TEST(ListenerOwner, AListenerAtAnotherAddressIsNotMeant) {
    const Listener listener(address4(INADDR_LOOPBACK + 1, 0));

    EXPECT_FALSE(isListenerTrusted(address4(INADDR_LOOPBACK, listener.port)));
}

TEST(ListenerOwner, AListenerOfBothProtocolsIsTrustedByEither) {
    const Listener listener(address6(in6addr_any, 0));
    if (listener.port == 0)
        GTEST_SKIP() << "no version 6 of the protocol here";

    EXPECT_TRUE(isListenerTrusted(address4(INADDR_LOOPBACK, listener.port)));
    EXPECT_TRUE(isListenerTrusted(address6(in6addr_loopback, listener.port)));
}

TEST(ListenerOwner, AListenerOfTheNewerProtocolAloneIsNoneOfTheOlder) {
    const Listener listener(address6(in6addr_loopback, 0));
    if (listener.port == 0)
        GTEST_SKIP() << "no version 6 of the protocol here";

    EXPECT_TRUE(isListenerTrusted(address6(in6addr_loopback, listener.port)));
    EXPECT_FALSE(isListenerTrusted(address4(INADDR_LOOPBACK, listener.port)));
}

}  // namespace
}  // namespace parvel::testing
