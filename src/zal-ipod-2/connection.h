// Connection to the daemon: the first connect to its abstract local socket, and the
// reconnect to the address given at connect time or in ZALIPODDAEMON.
#pragma once

#include "zal-ipod-2/handle.h"

// Name of the daemon's socket in the abstract namespace.
constexpr const char *kDaemonSocketName = "zal.ipod.IPodDaemon";
// TCP port used when a target gives port 0.
constexpr int kDefaultDaemonPort = 1910;
// Longest target text accepted for a reconnect.
constexpr std::size_t kMaxTargetLength = 255;

// Connects again after the connection was lost; runs with no lock held. Returns the new
// descriptor, or -1 (logged).
int zal_ipod_reconnect(zal_ipod_handle *h);

// Test seam: the abstract name the first connect uses (default kDaemonSocketName). Tests
// that cannot get a private network namespace point it at a name of their own. NULL
// restores the default. Not thread-safe; set it before connecting.
void zal_set_daemon_socket_name(const char *name);
const char *zal_daemon_socket_name();
