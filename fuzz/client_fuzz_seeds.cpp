// Writes the seed inputs of the client fuzz harness into the folder given as argument:
// for every command, a session reply followed by an integer reply, a hash reply and an
// error reply to it; and for every event kind, an event with a data hash of the fields
// the accessors read. Usage: client_fuzz_seeds FOLDER
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "client_fuzz_commands.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/serialize.h"

namespace {

using Bytes = std::vector<unsigned char>;

Bytes packet(uint16_t tid, uint8_t opcode, gval *value) {
    uint32_t length = 0;
    unsigned char *payload = value != nullptr ? serialize(value, &length) : nullptr;
    serialize_free(value);
    Bytes out(kPacketHeaderSize);
    zal_packet_header(out.data(), tid, opcode, length);
    out.insert(out.end(), payload, payload + length);
    free(payload);
    return out;
}

void segment(Bytes &input, uint8_t selector, const Bytes &daemon_output) {
    input.push_back(selector);
    input.push_back(static_cast<unsigned char>(daemon_output.size() & 0xff));
    input.push_back(static_cast<unsigned char>(daemon_output.size() >> 8));
    input.insert(input.end(), daemon_output.begin(), daemon_output.end());
}

gval *device() {
    gval *d = serialize_hash();
    serialize_hash_add(d, "serial", serialize_string("SEED0001"));
    serialize_hash_add(d, "authenticated", serialize_int(1));
    serialize_hash_add(d, "protocolinuse", serialize_int(2));
    serialize_hash_add(d, "transport", serialize_int(1));
    return d;
}

gval *session_reply() {
    gval *r = serialize_hash();
    serialize_hash_add(r, "result", serialize_int(1));
    gval *list = serialize_array();
    serialize_array_add(list, device());
    serialize_hash_add(r, "devices", list);
    return r;
}

// A hash with the keys that replies and event data use, each with a plausible value.
gval *busy_hash() {
    gval *h = serialize_hash();
    const char *texts[] = {"serial", "title", "artist", "album", "name", "status", "ssid",
                           "passphrase", "remote_id", "display_name", "image_path", "error"};
    for (const char *k : texts) serialize_hash_add(h, k, serialize_string("seed"));
    const char *ints[] = {"result", "position", "length", "index", "state", "mode", "count",
                          "session", "protocol", "progress", "type", "width", "height", "format"};
    for (int i = 0; i < static_cast<int>(sizeof ints / sizeof ints[0]); ++i)
        serialize_hash_add(h, ints[i], serialize_int(i));
    const unsigned char bytes[] = {1, 2, 3, 4, 5, 6, 7, 8};
    serialize_hash_add(h, "data", serialize_bytes(bytes, sizeof bytes));
    return h;
}

gval *error_reply() {
    gval *h = serialize_hash();
    serialize_hash_add(h, "error", serialize_string("device refused"));
    return h;
}

gval *event(const char *type, gval *data) {
    gval *h = serialize_hash();
    serialize_hash_add(h, "event", serialize_string(type));
    serialize_hash_add(h, "session", serialize_int(1));
    serialize_hash_add(h, "serial", serialize_string("SEED0001"));
    if (data != nullptr) serialize_hash_add(h, "data", data);
    return h;
}

bool write_file(const std::string &path, const Bytes &bytes) {
    FILE *f = fopen(path.c_str(), "wb");
    if (f == nullptr) return false;
    bool ok = fwrite(bytes.data(), 1, bytes.size(), f) == bytes.size();
    return fclose(f) == 0 && ok;
}

const char *const kEventTypes[] = {
    "connected_ipod", "disconnected_ipod", "fail_to_detect", "authenticated", "mode_changed",
    "play_state_changed", "track_index_changed", "samplerate_retrived",
    "track_position_changed", "chapter_index_changed", "init_state", "protocolinuse",
    "medialibrary_update", "media_changed", "artwork_transfer_done",
    "bluetooth_connection_update", "data_session", "location_information", "playing_app",
    "telephony_callstate_information", "vehicle_status_updates", "wifi_information",
    "telephony_update", "track_is_audiobook", "track_contains_video", "shuffle_mode_changed",
    "repeat_mode_changed", "disconnected_ipod_hostmode", "role_switched",
    "telephony_vcard_information", "ipod_device_name", "wireless_carplay_update"};

}  // namespace

int main(int argc, char **argv) {
    if (argc != 2) {
        fprintf(stderr, "usage: %s FOLDER\n", argv[0]);
        return 2;
    }
    const std::string folder = argv[1];
    int written = 0;
    for (unsigned c = 0; c < zal_fuzz_command_count(); ++c) {
        const auto selector = static_cast<uint8_t>(0x80 | c);
        Bytes input;
        segment(input, 0x80, packet(1, ZAL_OP_RETURN, session_reply()));  // open session: tid 1
        Bytes replies = packet(2, ZAL_OP_RETURN, serialize_int(0));
        segment(input, selector, replies);
        segment(input, selector, packet(3, ZAL_OP_RETURN, busy_hash()));
        segment(input, selector, packet(4, ZAL_OP_ERROR, error_reply()));
        if (!write_file(folder + "/command-" + std::to_string(c), input)) return 1;
        ++written;
    }
    for (const char *type : kEventTypes) {
        Bytes input;
        Bytes out = packet(0, ZAL_OP_EVENT, event(type, busy_hash()));
        Bytes plain = packet(0, ZAL_OP_EVENT, event(type, serialize_int(1)));
        out.insert(out.end(), plain.begin(), plain.end());
        segment(input, 0x80 | 2, out);
        if (!write_file(folder + "/event-" + type, input)) return 1;
        ++written;
    }
    printf("%d seeds written to %s\n", written, folder.c_str());
    return 0;
}
