// Transport and remote-control commands without argument: each needs an open session,
// answers the integer 0, then applies its change to the device's player (whose events
// follow the reply).
#include "handlers.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

constexpr int32_t kVolumeStep = 5;

using Action = void (*)(World &, Device &);

template <Action act>
void transport(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    c.reply_int(0);
    act(c.world, *d);
}

// Starting playback needs something to play.
template <Action act>
void needs_tracks(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    if (d->spec.tracks.empty()) return c.fail("the device has no tracks");
    c.reply_int(0);
    act(c.world, *d);
}

void nothing(World &, Device &) {}

struct Entry {
    uint8_t opcode;
    Handler handler;
};

const Entry kTransport[] = {
    {ZAL_OP_PLAY, needs_tracks<[](World &w, Device &d) { w.play(d); }>},
    {ZAL_OP_PLAYPAUSE, needs_tracks<[](World &w, Device &d) { w.play_pause(d); }>},
    {ZAL_OP_STOP, transport<[](World &w, Device &d) { w.stop(d); }>},
    {ZAL_OP_PAUSE, transport<[](World &w, Device &d) { w.pause(d); }>},
    {ZAL_OP_NEXT_TRACK, transport<[](World &w, Device &d) { w.next_track(d); }>},
    {ZAL_OP_PREV_TRACK, transport<[](World &w, Device &d) { w.previous_track(d); }>},
    {ZAL_OP_MUTE, transport<[](World &w, Device &d) { w.toggle_mute(d); }>},
    {ZAL_OP_VOLUME_INC, transport<[](World &w, Device &d) { w.change_volume(d, kVolumeStep); }>},
    {ZAL_OP_VOLUME_DEC, transport<[](World &w, Device &d) { w.change_volume(d, -kVolumeStep); }>},
    {ZAL_OP_START_DEV_AUDIO_ROUTE, transport<nothing>},
    {ZAL_OP_STOP_DEV_AUDIO_ROUTE, transport<nothing>},
    {ZAL_OP_TRACKING_DEC, transport<nothing>},
    {ZAL_OP_TRACKING_INC, transport<nothing>},
    {ZAL_OP_TRACKING_NORMAL, transport<nothing>},
    {ZAL_OP_START_FFW, needs_tracks<[](World &w, Device &d) { w.seek(d, kSeekingForward); }>},
    {ZAL_OP_START_REW, needs_tracks<[](World &w, Device &d) { w.seek(d, kSeekingBackward); }>},
    {ZAL_OP_STOP_FFWREW, transport<[](World &w, Device &d) { w.end_seek(d); }>},
    {ZAL_OP_VOICE_COMMAND, transport<nothing>},
    {ZAL_OP_PROMOTE, transport<nothing>},
    {ZAL_OP_DEMOTE, transport<nothing>},
    {ZAL_OP_ADD_TO_CART, transport<nothing>},
    {ZAL_OP_START_BT_UPDATES, transport<[](World &w, Device &d) {
         w.emit(d, "bluetooth_connection_update", make_string("connected"));
     }>},
    {ZAL_OP_STOP_BT_UPDATES, transport<nothing>},
};

}  // namespace

void register_transport_handlers(HandlerTable &table) {
    for (const Entry &e : kTransport) table[e.opcode] = e.handler;
}

}  // namespace sim
