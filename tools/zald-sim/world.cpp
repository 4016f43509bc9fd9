// Devices, their arrival, authentication, sessions, and the player with its clock.
#include "world.h"

#include <algorithm>
#include <cstdio>
#include <new>

#include "preferences.h"
#include "sim_log.h"
#include "zal-ipod-2/daemon.h"

namespace sim {

LibraryTrack library_track_of(const Track &t) {
    LibraryTrack lt;
    static_cast<TrackTags &>(lt) = t;
    lt.uid = t.uid;
    return lt;
}

namespace {

// Seeking runs the clock this many times faster, backwards for rewind.
constexpr int32_t kSeekRate = 4;
// PREV_TRACK restarts the current track when it has played longer than this.
constexpr int32_t kRestartThresholdMs = 3000;
// An iAP1 device enters extended mode this long after a session opens on it.
constexpr Millis kExtendedModeDelayMs = 100;

bool is_moving(int32_t state) {
    return state == kPlaying || state == kSeekingForward || state == kSeekingBackward;
}

}  // namespace

const Track *Device::current_track() const {
    if (player.track < 0 || player.track >= static_cast<int32_t>(spec.tracks.size()))
        return nullptr;
    return &spec.tracks[static_cast<size_t>(player.track)];
}

const Track *Device::track_by_uid(uint64_t uid) const {
    for (const Track &t : spec.tracks)
        if (t.uid == uid) return &t;
    return nullptr;
}

int32_t Device::current_chapter() const {
    const Track *t = current_track();
    return t != nullptr ? chapter_at(*t, player.position_ms) : -1;
}

int32_t chapter_start(const Track &track, int32_t chapter) {
    int32_t start = 0;
    for (int32_t i = 0; i < chapter && i < static_cast<int32_t>(track.chapters.size()); ++i)
        start += track.chapters[static_cast<size_t>(i)].length_ms;
    return start;
}

int32_t chapter_at(const Track &track, int32_t position_ms) {
    if (track.chapters.empty()) return -1;
    int32_t end = 0;
    for (size_t i = 0; i < track.chapters.size(); ++i) {
        end += track.chapters[i].length_ms;
        if (position_ms < end) return static_cast<int32_t>(i);
    }
    return static_cast<int32_t>(track.chapters.size()) - 1;
}

namespace {

// The play queue's tracks belong to the library too, under the same identifiers.
void add_queue_to_library(DeviceSpec &spec) {
    for (Track &t : spec.tracks) t.uid = spec.library.add_track(library_track_of(t));
}

}  // namespace

World::World(std::vector<DeviceSpec> specs, WorldHost &host) : host_(host) {
    int32_t next_id = 1;
    for (auto &spec : specs) {
        auto device = std::make_unique<Device>();
        device->id = next_id++;
        device->player = spec.player;
        device->authenticated = spec.authenticated;
        device->extended = spec.extended;
        device->present = spec.present;
        device->preferences = default_preferences();
        device->accessory.reset(spec.accessory);
        device->spec = std::move(spec);
        // Identifiers nobody gave: the device number in the high half, the place below.
        for (size_t i = 0; i < device->spec.tracks.size(); ++i) {
            Track &t = device->spec.tracks[i];
            if (t.uid == 0) t.uid = (uint64_t(uint32_t(device->id)) << 32) | (i + 1);
        }
        add_queue_to_library(device->spec);
        devices_.push_back(std::move(device));
    }
}

void World::start() {
    for (auto &device : devices_) {
        if (device->present && !device->authenticated) authenticate(*device);
        run_battery(*device);
    }
    // Scenario changes of the libraries, each pushed to a running update stream.
    for (auto &device : devices_) {
        for (const TimedLibraryChange &change : device->spec.library_changes) {
            const int32_t id = device->id;
            host_.after(change.at_ms, [this, id, change] {
                Device *d = by_id(id);
                if (d == nullptr) return;
                MediaLibrary &library = d->spec.library;
                if (!change.remove.empty()) {
                    std::vector<uint64_t> uids;
                    for (const std::string &title : change.remove)
                        for (const LibraryTrack &t : library.tracks())
                            if (t.title == title) uids.push_back(t.uid);
                    library.remove(uids);
                }
                if (!change.insert.empty()) library.insert(change.insert);
                SIM_LOGI("zald-sim: library of %s now at revision %u\n", d->spec.serial.c_str(),
                         library.revision);
                if (d->present) push_library_updates(*this, *d);
            });
        }
    }
}

std::vector<Device *> World::present() const {
    std::vector<Device *> list;
    for (const auto &device : devices_)
        if (device->present) list.push_back(device.get());
    return list;
}

Device *World::find(const std::string &serial) const {
    for (const auto &device : devices_)
        if (device->spec.serial == serial) return device.get();
    return nullptr;
}

Device *World::by_id(int32_t id) const {
    for (const auto &device : devices_)
        if (device->id == id) return device.get();
    return nullptr;
}

namespace {

// The daemon's record of an attached device, as the shared list builder reads it.
zal_attached_device attached_record(const Device &d) {
    zal_attached_device r{};
    snprintf(r.serial, sizeof r.serial, "%s", d.spec.serial.c_str());
    snprintf(r.name, sizeof r.name, "%s", d.spec.name.c_str());
    r.protocol = d.spec.protocol;
    r.iap2_authenticated = d.authenticated ? 1 : 0;
    r.link_state.authenticated = d.authenticated ? 1 : 0;
    r.link_state.used = d.sessions > 0 ? 1 : 0;
    r.link_state.extended = d.extended ? 1 : 0;
    switch (d.spec.link) {
        case Link::kUsb:
        case Link::kUsbRole:
            r.link_kind = ZAL_LINK_USB;
            r.usb_role = d.spec.link == Link::kUsbRole ? 1 : 0;
            break;
        case Link::kBluetooth:
            r.link_kind = ZAL_LINK_BLUETOOTH;
            break;
        case Link::kOther:
            r.link_kind = ZAL_LINK_OTHER;
            break;
    }
    r.usb_bus = static_cast<uint8_t>(d.spec.bus);
    r.usb_address = static_cast<uint8_t>(d.spec.address);
    r.rfcomm_channel = static_cast<uint8_t>(d.spec.rfcomm);
    return r;
}

// Entries for these devices, built by the daemon-side list builder.
ValuePtr entries(const std::vector<const Device *> &devices) {
    zal_device_registry registry{};
    for (const Device *d : devices) {
        const zal_attached_device record = attached_record(*d);
        if (zal_device_registry_add(&registry, &record) == nullptr) {
            zal_device_registry_clear(&registry);
            throw std::bad_alloc();
        }
    }
    ValuePtr list(get_current_devices(&registry));
    zal_device_registry_clear(&registry);
    if (!list) throw std::bad_alloc();
    return list;
}

}  // namespace

ValuePtr World::device_entry(const Device &d) {
    ValuePtr list = entries({&d});
    return ValuePtr(serialize_dup(serialize_array_get(list.get(), 0)));
}

ValuePtr World::device_list() const {
    const auto list = present();
    return entries(std::vector<const Device *>(list.begin(), list.end()));
}

void World::emit(const Device &d, const char *type, ValuePtr data) {
    host_.broadcast(type, d.id, d.spec.serial, std::move(data));
}

bool World::attach(const std::string &serial) {
    Device *d = find(serial);
    if (d == nullptr || d->present) return false;
    d->present = true;
    d->authenticated = false;
    d->extended = false;
    d->sessions = 0;
    d->player = d->spec.player;
    SIM_LOGI("zald-sim: device %s (%s) attached\n", d->spec.serial.c_str(), d->spec.name.c_str());
    emit(*d, "connected_ipod", device_entry(*d));
    authenticate(*d);
    return true;
}

bool World::detach(const std::string &serial) {
    Device *d = find(serial);
    if (d == nullptr || !d->present) return false;
    d->present = false;
    d->sessions = 0;
    d->extended = false;
    d->player.state = kStopped;
    SIM_LOGI("zald-sim: device %s removed\n", d->spec.serial.c_str());
    host_.device_removed(d->id);
    emit(*d, "disconnected_ipod", make_string(d->spec.serial));
    return true;
}

void World::authenticate(Device &device) {
    const int32_t id = device.id;
    host_.after(device.spec.auth_delay_ms, [this, id] {
        Device *d = by_id(id);
        if (d == nullptr || !d->present || d->authenticated) return;
        d->authenticated = d->spec.auth_succeeds;
        SIM_LOGI("zald-sim: device %s authentication %s\n", d->spec.serial.c_str(),
                 d->authenticated ? "succeeded" : "failed");
        emit_int(*d, "authenticated", d->authenticated ? 1 : 0);
        if (d->authenticated && d->spec.protocol == 2) emit_int(*d, "protocolinuse", 2);
    });
}

void World::announce_session(Device &d) {
    emit(d, "ipod_device_name", make_string(d.spec.name));
    if (d.spec.protocol == 2) {
        emit(d, "playing_app", make_string(d.spec.playing_app));
        return;
    }
    if (d.extended) return;
    const int32_t id = d.id;
    host_.after(kExtendedModeDelayMs, [this, id] {
        Device *dev = by_id(id);
        if (dev == nullptr || !dev->present || dev->sessions == 0 || dev->extended) return;
        if (!dev->authenticated) return;  // mode changes only follow a good authentication
        dev->extended = true;
        emit_int(*dev, "mode_changed", 1);
    });
}

void World::settle_session(Device &d) {
    if (d.sessions == 0 && d.spec.protocol == 1 && d.extended) {
        d.extended = false;
        emit_int(d, "mode_changed", 0);
    }
}

void World::set_state(Device &d, int32_t state) {
    if (d.player.state == state) return;
    d.player.state = state;
    emit_int(d, "play_state_changed", state);
}

// A new track: its index and position, its chapter, sample rate, flags and picture.
void World::move_to_track(Device &d, int32_t index) {
    d.player.track = index;
    d.player.position_ms = 0;
    emit_int(d, "track_index_changed", index);
    emit_int(d, "track_position_changed", 0);
    const Track *t = d.current_track();
    if (t == nullptr) return;
    announce_chapter(d);
    emit_int(d, "samplerate_retrived", t->sample_rate);
    if (t->audiobook) emit_int(d, "track_is_audiobook", 1);
    if (t->video) emit_int(d, "track_contains_video", 1);
    emit(d, "artwork_transfer_done", make_string(t->album));
}

void World::announce_chapter(Device &d) {
    const Track *t = d.current_track();
    if (t == nullptr) return;
    emit(d, "chapter_index_changed",
         HashBuilder()
             .add("track_index", d.player.track)
             .add("chapter_index", d.current_chapter())
             .add("chapter_count", static_cast<int32_t>(t->chapters.size()))
             .take());
}

bool World::set_chapter(Device &d, int32_t chapter) {
    const Track *t = d.current_track();
    if (t == nullptr || chapter < 0 || chapter >= static_cast<int32_t>(t->chapters.size()))
        return false;
    d.player.position_ms = chapter_start(*t, chapter);
    emit_int(d, "track_position_changed", d.player.position_ms);
    announce_chapter(d);
    return true;
}

void World::play(Device &d) {
    set_state(d, kPlaying);
}

void World::pause(Device &d) {
    if (is_moving(d.player.state)) set_state(d, kPaused);
}

void World::play_pause(Device &d) {
    set_state(d, is_moving(d.player.state) ? kPaused : kPlaying);
}

void World::stop(Device &d) {
    set_state(d, kStopped);
    if (d.player.position_ms != 0) {
        d.player.position_ms = 0;
        emit_int(d, "track_position_changed", 0);
    }
}

void World::next_track(Device &d) {
    const auto count = static_cast<int32_t>(d.spec.tracks.size());
    if (count == 0) return;
    move_to_track(d, (d.player.track + 1) % count);
}

void World::previous_track(Device &d) {
    const auto count = static_cast<int32_t>(d.spec.tracks.size());
    if (count == 0) return;
    if (d.player.position_ms > kRestartThresholdMs) {
        d.player.position_ms = 0;
        emit_int(d, "track_position_changed", 0);
        return;
    }
    move_to_track(d, (d.player.track + count - 1) % count);
}

void World::seek(Device &d, int32_t state) {
    set_state(d, state);
}

void World::end_seek(Device &d) {
    if (d.player.state == kSeekingForward || d.player.state == kSeekingBackward)
        set_state(d, kPlaying);
}

void World::toggle_mute(Device &d) {
    d.player.muted = !d.player.muted;
}

void World::change_volume(Device &d, int32_t step) {
    d.player.volume = std::clamp(d.player.volume + step, 0, 100);
}

bool World::set_position(Device &d, int32_t position_ms) {
    const Track *track = d.current_track();
    if (track == nullptr || position_ms < 0 || position_ms >= track->length_ms) return false;
    d.player.position_ms = position_ms;
    emit_int(d, "track_position_changed", position_ms);
    return true;
}

bool World::set_track(Device &d, int32_t index) {
    if (index < 0 || index >= static_cast<int32_t>(d.spec.tracks.size())) return false;
    move_to_track(d, index);
    return true;
}

bool World::set_shuffle(Device &d, int32_t mode) {
    if (mode < 0 || mode > 2) return false;
    if (d.player.shuffle != mode) {
        d.player.shuffle = mode;
        emit_int(d, "shuffle_mode_changed", mode);
    }
    return true;
}

bool World::set_repeat(Device &d, int32_t mode) {
    if (mode < 0 || mode > 2) return false;
    if (d.player.repeat != mode) {
        d.player.repeat = mode;
        emit_int(d, "repeat_mode_changed", mode);
    }
    return true;
}

void World::play_queue(Device &d, const std::vector<const LibraryTrack *> &queue, int32_t start) {
    std::vector<Track> tracks;
    tracks.reserve(queue.size());
    for (const LibraryTrack *t : queue) {
        // A track already queued keeps what the scenario gave it (chapters, artwork, ...).
        if (const Track *queued = d.track_by_uid(t->uid)) {
            tracks.push_back(*queued);
            continue;
        }
        Track track;
        track.title = t->title;
        track.artist = t->artist;
        track.album = t->album;
        track.genre = t->genre;
        track.composer = t->composer;
        track.length_ms = t->length_ms;
        track.audiobook = t->audiobook;
        track.uid = t->uid;
        tracks.push_back(std::move(track));
    }
    d.spec.tracks = std::move(tracks);
    SIM_LOGI("zald-sim: device %s plays a queue of %zu tracks from %d\n", d.spec.serial.c_str(),
             d.spec.tracks.size(), start);
    move_to_track(d, start);
    set_state(d, kPlaying);
}

void World::tick(Millis elapsed) {
    for (Device *d : present()) {
        PlayerState &p = d->player;
        if (!is_moving(p.state)) continue;
        const Track *track = d->current_track();
        if (track == nullptr) continue;
        int32_t rate = p.state == kSeekingForward    ? kSeekRate
                       : p.state == kSeekingBackward ? -kSeekRate
                                                     : 1;
        int64_t position = p.position_ms + elapsed * rate;
        if (position < 0) {
            p.position_ms = 0;
            set_state(*d, kPlaying);
        } else if (position >= track->length_ms) {
            const auto count = static_cast<int32_t>(d->spec.tracks.size());
            if (p.repeat == 1) {
                p.position_ms = 0;
            } else if (p.track + 1 < count || p.repeat == 2) {
                move_to_track(*d, (p.track + 1) % count);
                continue;
            } else {
                stop(*d);
                continue;
            }
        } else {
            const int32_t chapter = d->current_chapter();
            p.position_ms = static_cast<int32_t>(position);
            if (d->current_chapter() != chapter) announce_chapter(*d);
        }
        emit_int(*d, "track_position_changed", p.position_ms);
    }
}

}  // namespace sim
