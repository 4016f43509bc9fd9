// The handler table and what every family shares.
#include "handlers.h"

namespace sim {

Device *Call::session_device() const {
    if (session.device_id == 0) return nullptr;
    Device *d = world.by_id(session.device_id);
    return d != nullptr && d->present ? d : nullptr;
}

Device *Call::require_session() {
    Device *d = session_device();
    if (d == nullptr) fail("no session is open");
    return d;
}

HandlerTable make_handler_table() {
    HandlerTable table{};
    register_core_handlers(table);
    register_transport_handlers(table);
    register_playback_handlers(table);
    register_artwork_handlers(table);
    register_device_handlers(table);
    register_comms_handlers(table);
    register_media_handlers(table);
    register_browse_handlers(table);
    return table;
}

}  // namespace sim
