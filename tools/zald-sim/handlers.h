// Request handlers: one function per opcode, kept in a table indexed by opcode. Each family
// of commands lives in its own handlers_<family>.cpp and registers its entries; an opcode
// without an entry is answered with an ERROR packet.
#pragma once

#include <array>
#include <cstdint>
#include <string>

#include "config_store.h"
#include "value_util.h"
#include "world.h"

namespace sim {

// What a connection has open.
struct ClientSession {
    int32_t device_id = 0;  // 0: no session
};

// One request being answered. The server supplies reply() and fail(), which apply the
// fault injection chosen for this request.
class Call {
  public:
    Call(World &w, ConfigStore &c, ClientSession &s, uint16_t t, uint8_t op, const gval *a)
        : world(w), config(c), session(s), tid(t), opcode(op), arg(a) {}
    virtual ~Call() = default;

    // RETURN with the value as payload (none when value is null).
    virtual void reply(ValuePtr value) = 0;
    // ERROR whose payload is the hash {"error": text}.
    virtual void fail(const std::string &text) = 0;

    void reply_int(int32_t v) { reply(make_int(v)); }
    // The present device this connection has a session on, or null.
    Device *session_device() const;
    // Same, answering ERROR "no session is open" when there is none.
    Device *require_session();

    World &world;
    ConfigStore &config;
    ClientSession &session;
    const uint16_t tid;
    const uint8_t opcode;
    const gval *const arg;  // decoded payload, or null
};

using Handler = void (*)(Call &);
using HandlerTable = std::array<Handler, 256>;

// Every family's handlers in one table.
HandlerTable make_handler_table();

// Family registrations.
void register_core_handlers(HandlerTable &table);
void register_transport_handlers(HandlerTable &table);
void register_playback_handlers(HandlerTable &table);
void register_artwork_handlers(HandlerTable &table);
void register_device_handlers(HandlerTable &table);
void register_comms_handlers(HandlerTable &table);
void register_media_handlers(HandlerTable &table);
void register_browse_handlers(HandlerTable &table);

}  // namespace sim
