// Helpers for client tests: handles without a connection (for the dispatcher and the
// decoders), reply records built from values, device entries and device lists.
#pragma once

#include <cstdint>
#include <string>

#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace zaltest {

// A handle as zal_ipod_connect leaves it, but with no socket (fd -1). Release with
// zal_ipod_close.
zal_ipod_handle *offline_handle();

// A reply record with the encoding of value (taken; nullptr: no payload). Owned by the
// caller (reply_record_free) unless queued.
zal_ipod_reply *make_reply(uint16_t tid, uint8_t opcode, gval *value);
// Appends a record to the handle's received-packet queue.
void queue_record(zal_ipod_handle *h, zal_ipod_reply *r);
// Queues an EVENT record with the event hash (see event_frame).
void queue_event(zal_ipod_handle *h, const char *type, gval *data, const char *serial = nullptr,
                 int session = 1);

// A device entry like the daemon's.
gval *device_entry(const char *serial, int authenticated, int protocol, int extended = 0);
// An array of entries (takes them).
gval *device_list(std::initializer_list<gval *> entries);

class FakeDaemon;
// Connects to d (HELLO answered with one device "P") and opens a session on it, so that
// the handle is ready for commands; the session is iAP2 when protocol is 2. The script
// steps are added to d; expect the command's own steps after them.
zal_ipod_handle *connect_with_session(FakeDaemon &d, int protocol = 1);

// A hash from (key, value) pairs (values taken).
gval *hash_of(std::initializer_list<std::pair<const char *, gval *>> items);

}  // namespace zaltest
