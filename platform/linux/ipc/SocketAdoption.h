#pragma once

#include "platform/linux/ipc/BusPointers.h"
#include "platform/linux/system/Descriptor.h"

namespace zelkord::ipc {

// Makes the server's side of a peer-to-peer D-Bus connection out of a socket whose authentication
// has ended and of which nothing beyond was read. Null when the system gives no descriptors; the
// socket is then left as it was.
//
// sd-bus insists on authenticating by itself, and reads beyond the end of it what then escapes our
// look at the size of each message. So it authenticates a socket pair of ours, whose descriptor
// then becomes the real socket.
//
// In between it meets a descriptor that is no socket, and from then on reads in a way in which the
// kernel hands over no descriptors: what a client attaches is closed at once. No method takes any,
// and pieces of a message could bring as many as there are.
BusPtr adoptSocket(Descriptor& socket, bool passesDescriptors);

}  // namespace zelkord::ipc
