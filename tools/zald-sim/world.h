// The simulated world: attached devices with their media library and player, device
// arrival and removal, authentication and mode changes, and the playback clock. Every change
// a client could observe is pushed through the event sink as one event.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "accessory.h"
#include "media_library.h"
#include "value_util.h"

namespace sim {

using Millis = int64_t;

// Play states as the devices report them.
enum PlayState : int32_t {
    kStopped = 0,
    kPlaying = 1,
    kPaused = 2,
    kSeekingForward = 3,
    kSeekingBackward = 4,
};

// Link kinds; the number is the "transport" of a device entry.
enum class Link : int32_t { kUsb = 0, kUsbRole = 1, kBluetooth = 2, kOther = 3 };

struct Chapter {
    std::string title;
    int32_t length_ms = 60000;
};

struct Track : TrackTags {
    bool video = false;
    int32_t sample_rate = 44100;
    uint64_t uid = 0;               // persistent identifier; 0: derived from the track's place
    uint32_t album_color = 0;       // 0xRRGGBB of the album's picture; 0: derived from the album
    std::vector<Chapter> chapters;  // back to back from 0; empty: no chapters
    std::vector<int32_t> artwork_times_ms;  // empty: the chapter starts, or 0
};

// A play-queue track as a media-library record (same identifier and fields).
LibraryTrack library_track_of(const Track &t);

// How a device hands out its pictures.
struct ArtworkSpec {
    bool shared_file = true;  // false: pixels inline in the reply
    int32_t width = 240;
    int32_t height = 240;
    int32_t pixel_format = 2;  // 2: RGB 5-6-5 little-endian, 3: big-endian
};

struct PlayerState {
    int32_t state = kStopped;
    int32_t track = 0;
    int32_t position_ms = 0;
    int32_t shuffle = 0;
    int32_t repeat = 0;  // 0 off, 1 one track, 2 all
    int32_t volume = 50;
    bool muted = false;
};

// A device as a scenario describes it.
struct DeviceSpec {
    std::string serial;
    std::string name;
    int32_t protocol = 2;  // 1 iAP1, 2 iAP2
    Link link = Link::kUsb;
    int32_t bus = 1;
    int32_t address = 2;
    int32_t rfcomm = 1;
    bool authenticated = true;
    bool extended = false;
    bool present = true;         // false: arrives through the script
    Millis auth_delay_ms = 300;  // from arrival to the authentication outcome
    bool auth_succeeds = true;
    std::string playing_app = "Music";
    std::vector<Track> tracks;  // the play queue
    PlayerState player;
    ArtworkSpec artwork;
    AccessorySpec accessory;
    // The media library (its changes over time included); a generated one when the
    // scenario gives none. The queue's tracks are part of it.
    MediaLibrary library;
    std::vector<TimedLibraryChange> library_changes;
};

struct Device {
    DeviceSpec spec;
    int32_t id = 0;  // stable number, sent as the "session" of its events
    bool present = false;
    bool authenticated = false;
    bool extended = false;
    int32_t sessions = 0;  // clients with a session open on it ("used")
    PlayerState player;
    std::map<int32_t, int32_t> preferences;  // class -> value
    AccessoryState accessory;
    MediaSession media;
    const Track *current_track() const;
    // The track with this persistent identifier, or null.
    const Track *track_by_uid(uint64_t uid) const;
    // Chapter of the current track at the current position; -1 without chapters.
    int32_t current_chapter() const;
};

// Start of a chapter in its track.
int32_t chapter_start(const Track &track, int32_t chapter);
// Chapter at a position; -1 for a track without chapters.
int32_t chapter_at(const Track &track, int32_t position_ms);

// What the world needs from the program around it.
class WorldHost {
  public:
    virtual ~WorldHost() = default;
    virtual void after(Millis delay, std::function<void()> action) = 0;
    // One event to every client. data may be null (no "data" key).
    virtual void broadcast(const char *type, int32_t session, const std::string &serial,
                           ValuePtr data) = 0;
    // The device left: sessions on it end.
    virtual void device_removed(int32_t device_id) = 0;
};

class World {
  public:
    World(std::vector<DeviceSpec> devices, WorldHost &host);
    // Starts what runs by itself: authentication of devices present but not authenticated.
    void start();

    // Present devices in list order.
    std::vector<Device *> present() const;
    Device *find(const std::string &serial) const;
    Device *by_id(int32_t id) const;
    // The device list as HELLO and session replies carry it.
    ValuePtr device_list() const;
    static ValuePtr device_entry(const Device &device);

    // Arrival and removal; false when the serial is unknown or already in that state.
    bool attach(const std::string &serial);
    bool detach(const std::string &serial);
    // Starts authentication of a present device (outcome after its delay).
    void authenticate(Device &device);

    // Sessions, in two steps each so that the reply (whose device list shows the new
    // "used" flag) goes out before the events the change causes.
    void join_session(Device &device) { ++device.sessions; }
    void announce_session(Device &device);
    void leave_session(Device &device) {
        if (device.sessions > 0) --device.sessions;
    }
    void settle_session(Device &device);

    // Transport. Each pushes the events of the changes it makes.
    void play(Device &d);
    void pause(Device &d);
    void play_pause(Device &d);
    void stop(Device &d);
    void next_track(Device &d);
    void previous_track(Device &d);
    void seek(Device &d, int32_t state);  // kSeekingForward or kSeekingBackward
    void end_seek(Device &d);
    void toggle_mute(Device &d);
    void change_volume(Device &d, int32_t step);
    // Setters; false when the value is out of range (nothing changes then).
    bool set_position(Device &d, int32_t position_ms);
    bool set_track(Device &d, int32_t index);
    bool set_shuffle(Device &d, int32_t mode);
    bool set_repeat(Device &d, int32_t mode);
    // Moves to the start of a chapter of the current track.
    bool set_chapter(Device &d, int32_t chapter);
    // Replaces the play queue by library tracks and plays from start (index in the queue).
    void play_queue(Device &d, const std::vector<const LibraryTrack *> &queue, int32_t start);

    // Playback clock: advances every playing device by elapsed milliseconds and pushes
    // their positions.
    void tick(Millis elapsed);

    // Runs action after delay on the program's clock (handlers schedule follow-up events).
    void after(Millis delay, std::function<void()> action) {
        host_.after(delay, std::move(action));
    }
    // Battery clock of a device (accessory.cpp), and its event.
    void run_battery(Device &d);
    void step_battery(Device &d);
    void announce_battery(Device &d);

    void emit(const Device &d, const char *type, ValuePtr data);
    void emit_int(const Device &d, const char *type, int32_t value) {
        emit(d, type, make_int(value));
    }

  private:
    void set_state(Device &d, int32_t state);
    void move_to_track(Device &d, int32_t index);
    void announce_chapter(Device &d);

    std::vector<std::unique_ptr<Device>> devices_;
    WorldHost &host_;
};

// Pushes the library changes a device's update stream has not carried yet
// (handlers_media.cpp); nothing while the stream is stopped.
void push_library_updates(World &world, Device &device);

}  // namespace sim
