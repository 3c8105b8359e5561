#pragma once

#include <string_view>

#include "host/daemon/Environment.h"

namespace marrowdale::host {

// Tells the service manager that started this process of its state ("READY=1", "STOPPING=1"), in
// the way sd_notify(3) documents: a datagram to the socket that NOTIFY_SOCKET names. Nothing
// happens where nobody wants to know.
void notifyServiceManager(const Environment& environment, std::string_view state);

}  // namespace marrowdale::host
