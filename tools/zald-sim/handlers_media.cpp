// The media library served both ways: record-by-record database browsing and track records
// for iAP1 devices; library identifier, update streams (insertions, deletions, revisions,
// resets), play items and collections for iAP2 devices; prepared identifier lists, Genius
// and play list information. Playing anything replaces the device's play queue.
#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "handlers.h"
#include "sim_log.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace sim {

namespace {

constexpr uint32_t kUidSize = 8;
// Items per medialibrary_update event; a reset of a large library takes several.
constexpr size_t kItemsPerUpdate = 250;
// Record layouts of SET_UPDATE_ITEMS and PLAYCOLLECTION.
constexpr uint32_t kUpdateItemsSize = 392;
constexpr uint32_t kCollectionSize = 144;
constexpr uint32_t kFieldSize = 129;

ValuePtr uid_value(uint64_t uid) {
    unsigned char b[kUidSize];
    for (uint32_t i = 0; i < kUidSize; ++i) b[i] = static_cast<unsigned char>(uid >> (8 * (7 - i)));
    return ValuePtr(serialize_bytes(b, kUidSize));
}

uint64_t uid_from_be(const unsigned char *b) {
    uint64_t v = 0;
    for (uint32_t i = 0; i < kUidSize; ++i) v = (v << 8) | b[i];
    return v;
}

uint32_t le32(const unsigned char *p) {
    return static_cast<uint32_t>(p[0]) | static_cast<uint32_t>(p[1]) << 8 |
           static_cast<uint32_t>(p[2]) << 16 | static_cast<uint32_t>(p[3]) << 24;
}

uint64_t le64(const unsigned char *p) {
    return static_cast<uint64_t>(le32(p)) | static_cast<uint64_t>(le32(p + 4)) << 32;
}

// A NUL-terminated text inside a fixed field; false when the field has no terminator.
bool field_text(const unsigned char *field, std::string *out) {
    const void *nul = memchr(field, 0, kFieldSize);
    if (nul == nullptr) return false;
    out->assign(reinterpret_cast<const char *>(field),
                static_cast<size_t>(static_cast<const unsigned char *>(nul) - field));
    return true;
}

// An 8-byte identifier in a bytes value.
bool uid_of(const gval *v, uint64_t *out) {
    if (v == nullptr || serialize_type(v) != SERIALIZE_BYTES) return false;
    uint32_t length = 0;
    const auto *b = static_cast<const unsigned char *>(serialize_get_bytes(v, &length));
    if (length != kUidSize) return false;
    *out = uid_from_be(b);
    return true;
}

bool int_at(const Call &c, uint32_t index, int32_t *out) {
    return value_as_int(array_item(c.arg, index), out);
}

Device *device_of_protocol(Call &c, int32_t protocol) {
    Device *d = c.require_session();
    if (d == nullptr) return nullptr;
    if (d->spec.protocol != protocol) {
        c.fail(protocol == 1 ? "database browsing needs an iAP1 device"
                             : "this command needs an iAP2 device");
        return nullptr;
    }
    return d;
}

// The track listing the current filter gives, of the current category's kind when that is
// a kind of track.
std::vector<const LibraryTrack *> listed_tracks(const Device &d) {
    const MediaLibrary &lib = d.spec.library;
    std::vector<const LibraryTrack *> tracks = lib.tracks_under(d.media.filter);
    const int32_t category = d.media.category;
    if (category == kCategoryTrack || category == kCategoryAudiobook ||
        category == kCategoryPodcast || category == kCategoryItunesU) {
        const auto names = lib.items(category, d.media.filter);
        std::vector<const LibraryTrack *> kept;
        size_t next = 0;
        for (const LibraryTrack *t : tracks)
            if (next < names.size() && t->title == names[next]) kept.push_back(t), ++next;
        return kept;
    }
    return tracks;
}

// Capability bits of a track record: 1 audiobook, 8 video.
int32_t capability(const LibraryTrack &t, bool video) {
    return (t.audiobook ? 1 : 0) | (video ? 8 : 0);
}

ValuePtr track_records(const std::vector<const LibraryTrack *> &tracks, int32_t offset,
                       int32_t count, bool identifiers_only) {
    const auto total = static_cast<int32_t>(tracks.size());
    const int32_t first = offset < total ? offset : total;
    const int32_t n = count < total - first ? count : total - first;
    ValuePtr list(
        serialize_array_reserve(1 + static_cast<uint32_t>(n) * (identifiers_only ? 1 : 8)));
    serialize_array_add(list.get(), serialize_int(n));
    for (int32_t i = first; i < first + n; ++i) {
        const LibraryTrack &t = *tracks[static_cast<size_t>(i)];
        if (!identifiers_only) {
            serialize_array_add(list.get(), serialize_int(capability(t, false)));
            serialize_array_add(list.get(), serialize_string(t.title.c_str()));
            serialize_array_add(list.get(), serialize_string(t.artist.c_str()));
            serialize_array_add(list.get(), serialize_string(t.album.c_str()));
            serialize_array_add(list.get(), serialize_string(t.genre.c_str()));
            serialize_array_add(list.get(), serialize_string(t.composer.c_str()));
            serialize_array_add(list.get(), serialize_int(t.length_ms));
        }
        serialize_array_add(list.get(), uid_value(t.uid).release());
    }
    return list;
}

// ---- iAP1 database browsing ---------------------------------------------------------------

// Hierarchy 1 (audio) or 2 (video); starts the walk again at the top.
void set_hierarchy(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t hierarchy = 0;
    if (!value_as_int(c.arg, &hierarchy) || hierarchy < 1 || hierarchy > 2)
        return c.fail("the hierarchy is 1 (audio) or 2 (video)");
    d->media.hierarchy = hierarchy;
    d->media.filter.clear();
    d->media.category = kCategoryTop;
    c.reply_int(1);
}

// TOP starts the walk again and answers the number of categories; any other category
// answers its number of records under the records selected so far.
void set_category(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t category = 0;
    if (!value_as_int(c.arg, &category) || category < 0 || category >= kCategoryCount)
        return c.fail("no such category");
    if (category == kCategoryTop) d->media.filter.clear();
    d->media.category = category;
    c.reply_int(d->spec.library.count(category, d->media.filter));
}

// [record, category]: narrows to a record of the current category and moves to category;
// a record of a kind of track is played instead, with the listing as the queue.
void select_db(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t record = 0, category = 0;
    if (!int_at(c, 0, &record) || !int_at(c, 1, &category))
        return c.fail("SELECT_DB needs an array of two integers: record, category");
    if (category < 0 || category >= kCategoryCount) return c.fail("no such category");
    MediaSession &m = d->media;
    const MediaLibrary &lib = d->spec.library;
    const auto names = lib.items(m.category, m.filter);
    if (record < 0 || record >= static_cast<int32_t>(names.size()))
        return c.fail("no record " + std::to_string(record) + " in " + category_name(m.category));
    if (m.category == category && category == kCategoryTrack) {
        const auto queue = listed_tracks(*d);
        c.reply_int(static_cast<int32_t>(queue.size()));
        c.world.play_queue(*d, queue, record);
        return;
    }
    if (m.category != kCategoryTop)
        m.filter.push_back({m.category, names[static_cast<size_t>(record)]});
    m.category = category;
    c.reply_int(lib.count(category, m.filter));
}

// [offset, count] -> [total, validity, offset, n, names...]
void get_records(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t offset = 0, count = 0;
    if (!int_at(c, 0, &offset) || !int_at(c, 1, &count) || offset < 0 || count < 0)
        return c.fail("GET_DB_RECORDS needs an offset and a count, both 0 or more");
    const auto names = d->spec.library.items(d->media.category, d->media.filter);
    const auto total = static_cast<int32_t>(names.size());
    const int32_t first = offset < total ? offset : total;
    const int32_t n = count < total - first ? count : total - first;
    ValuePtr list(serialize_array_reserve(4 + static_cast<uint32_t>(n)));
    for (int32_t v : {total, 1, offset, n}) serialize_array_add(list.get(), serialize_int(v));
    for (int32_t i = first; i < first + n; ++i)
        serialize_array_add(list.get(), serialize_string(names[static_cast<size_t>(i)].c_str()));
    c.reply(std::move(list));
}

// Track information of an entry of the play queue.
void indexed_track_info(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t index = 0;
    if (!value_as_int(c.arg, &index)) return c.fail("INDEXED_TRACK_INFO needs an integer index");
    if (index < 0 || index >= static_cast<int32_t>(d->spec.tracks.size()))
        return c.fail("no track " + std::to_string(index) + " in the play queue");
    const Track &t = d->spec.tracks[static_cast<size_t>(index)];
    c.reply(HashBuilder()
                .add("indexed_track_info", 1)
                .add("title", t.title)
                .add("chapter", std::string())
                .add("artist", t.artist)
                .add("album", t.album)
                .add("artwork", 0)
                .add("has_chapters", 0)
                .add("length", t.length_ms)
                .add("track_index", index)
                .take());
}

// Type 0: library identifier (8 bytes), 1: last sync time (7 bytes: year high and low,
// month, day, hour, minute, second), other: the number of tracks.
void itunes_info(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t type = 0;
    if (!value_as_int(c.arg, &type)) return c.fail("GET_DB_ITUNES_INFO needs an integer type");
    HashBuilder info;
    info.add("type", type);
    if (type == 0) {
        uint64_t h = 1469598103934665603ull;
        for (unsigned char ch : d->spec.library.mlid) h = (h ^ ch) * 1099511628211ull;
        info.add("uid", uid_value(h).release());
    } else if (type == 1) {
        const unsigned char sync[7] = {0x07, 0xea, 11, 23, 8, 30, 0};
        info.add("last_sync", serialize_bytes(sync, sizeof sync));
    } else {
        info.add("count", static_cast<int32_t>(d->spec.library.tracks().size()));
    }
    c.reply(info.take());
}

// [offset, count, identifiers_only] over the tracks of the current selection.
void db_track_info(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t offset = 0, count = 0, ids = 0;
    if (!int_at(c, 0, &offset) || !int_at(c, 1, &count) || !int_at(c, 2, &ids) || offset < 0 ||
        count < 0)
        return c.fail("GET_DB_TRACK_INFO needs offset, count and identifiers_only");
    c.reply(track_records(listed_tracks(*d), offset, count, ids != 0));
}

// Same over the play queue.
void pb_track_info(Call &c) {
    Device *d = device_of_protocol(c, 1);
    if (d == nullptr) return;
    int32_t offset = 0, count = 0, ids = 0;
    if (!int_at(c, 0, &offset) || !int_at(c, 1, &count) || !int_at(c, 2, &ids) || offset < 0 ||
        count < 0)
        return c.fail("GET_PB_TRACK_INFO needs offset, count and identifiers_only");
    std::vector<LibraryTrack> queue;
    for (const Track &t : d->spec.tracks) queue.push_back(library_track_of(t));
    std::vector<const LibraryTrack *> pointers;
    for (const LibraryTrack &t : queue) pointers.push_back(&t);
    c.reply(track_records(pointers, offset, count, ids != 0));
}

// [first, second, size, bytes]: the identifier list PLAY_UID_LIST plays from.
void prepare_uid_list(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t size = 0;
    const gval *bytes = array_item(c.arg, 3);
    if (!int_at(c, 2, &size) || bytes == nullptr || serialize_type(bytes) != SERIALIZE_BYTES)
        return c.fail("PREPARE_UID_LIST needs first, second, size and the identifier bytes");
    uint32_t length = 0;
    const auto *b = static_cast<const unsigned char *>(serialize_get_bytes(bytes, &length));
    if (size < 0 || length != static_cast<uint32_t>(size) || length % kUidSize != 0)
        return c.fail("the identifier bytes are not size bytes of 8-byte identifiers");
    std::vector<uint64_t> list;
    for (uint32_t at = 0; at < length; at += kUidSize) {
        const uint64_t uid = uid_from_be(b + at);
        if (d->spec.library.track(uid) == nullptr) return c.fail("unknown track identifier");
        list.push_back(uid);
    }
    d->media.prepared = std::move(list);
    c.reply_int(1);
}

std::vector<const LibraryTrack *> tracks_of(const MediaLibrary &lib,
                                            const std::vector<uint64_t> &uids) {
    std::vector<const LibraryTrack *> tracks;
    for (uint64_t uid : uids)
        if (const LibraryTrack *t = lib.track(uid)) tracks.push_back(t);
    return tracks;
}

// The prepared list, from the track with this identifier.
void play_uid_list(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    uint64_t uid = 0;
    if (!uid_of(c.arg, &uid)) return c.fail("PLAY_UID_LIST needs an 8-byte identifier");
    const auto &prepared = d->media.prepared;
    for (size_t i = 0; i < prepared.size(); ++i) {
        if (prepared[i] != uid) continue;
        c.reply_int(1);
        c.world.play_queue(*d, tracks_of(d->spec.library, prepared), static_cast<int32_t>(i));
        return;
    }
    c.fail("the identifier is not in the prepared list");
}

// ---- iAP2 library and play commands -------------------------------------------------------

void media_library_uid(Call &c) {
    if (Device *d = c.require_session()) c.reply(make_string(d->spec.library.mlid));
}

// [count, start, uid...]
void play_items(Call &c) {
    Device *d = device_of_protocol(c, 2);
    if (d == nullptr) return;
    int32_t count = 0, start = 0;
    if (!int_at(c, 0, &count) || !int_at(c, 1, &start) || count < 0 ||
        serialize_array_count(c.arg) != count + 2)
        return c.fail("PLAYITEMS needs count, start and count identifiers");
    if (count == 0) return c.fail("nothing to play");
    if (start < 0 || start >= count) return c.fail("the start is not in the list");
    std::vector<const LibraryTrack *> queue;
    for (int32_t i = 0; i < count; ++i) {
        uint64_t uid = 0;
        if (!uid_of(array_item(c.arg, static_cast<uint32_t>(i) + 2), &uid))
            return c.fail("identifier " + std::to_string(i) + " is not 8 bytes");
        const LibraryTrack *t = d->spec.library.track(uid);
        if (t == nullptr) return c.fail("unknown track identifier");
        queue.push_back(t);
    }
    c.reply(HashBuilder().add("items_played", count).take());
    c.world.play_queue(*d, queue, start);
}

// The 144-byte collection record.
void play_collection(Call &c) {
    Device *d = device_of_protocol(c, 2);
    if (d == nullptr) return;
    if (c.arg == nullptr || serialize_type(c.arg) != SERIALIZE_STRUCT ||
        serialize_get_struct_length(c.arg) != kCollectionSize)
        return c.fail("PLAYCOLLECTION needs a collection record of 144 bytes");
    const auto *r = static_cast<const unsigned char *>(serialize_get_struct(c.arg));
    const auto start = static_cast<int32_t>(le32(r));
    const int32_t category = category_of_collection_type(r[4]);
    std::string mlid;
    if (!field_text(r + 5, &mlid)) return c.fail("the library identifier is not terminated");
    const MediaLibrary &lib = d->spec.library;
    if (mlid != lib.mlid) return c.fail("unknown media library \"" + mlid + "\"");
    if (category < 0) return c.fail("unknown collection type " + std::to_string(r[4]));
    const auto queue = lib.collection(category, le64(r + 136));
    if (queue.empty()) return c.fail("no such collection");
    if (start < 0 || start >= static_cast<int32_t>(queue.size()))
        return c.fail("the start index is not in the collection");
    c.reply(HashBuilder().add("collection_played", static_cast<int32_t>(queue.size())).take());
    c.world.play_queue(*d, queue, start);
}

// The 392-byte update items record: checked and acknowledged (the simulated library keeps
// no per-client item choices).
void set_update_items(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    if (c.arg == nullptr || serialize_type(c.arg) != SERIALIZE_STRUCT ||
        serialize_get_struct_length(c.arg) != kUpdateItemsSize)
        return c.fail("SET_UPDATE_ITEMS needs an update items record of 392 bytes");
    const auto *r = static_cast<const unsigned char *>(serialize_get_struct(c.arg));
    std::string mlid, aux;
    if (!field_text(r, &mlid) || !field_text(r + 258, &aux))
        return c.fail("a text of the update items record is not terminated");
    const auto length = static_cast<int32_t>(le32(r + 388));
    if (length < 0 || length >= MAXIMUM_MLID_LENGTH) return c.fail("bad item list length");
    if (mlid != d->spec.library.mlid) return c.fail("unknown media library \"" + mlid + "\"");
    c.reply_int(0);
}

uint32_t revision_of(const std::string &text) {
    if (text.empty() || text.find_first_not_of("0123456789") != std::string::npos) return 0;
    return static_cast<uint32_t>(std::strtoul(text.c_str(), nullptr, 10));
}

void start_updates(Call &c, Device &d, uint32_t since) {
    d.media.updates = true;
    d.media.sent_revision = since;
    c.reply_int(0);
    push_library_updates(c.world, d);
}

// Text: the last revision the client holds ("" or anything else: none, a reset follows).
void start_library_update(Call &c) {
    Device *d = device_of_protocol(c, 2);
    if (d == nullptr) return;
    std::string text;
    if (!value_as_string(c.arg, &text)) return c.fail("START_LIB_UPDATE needs a text");
    start_updates(c, *d, revision_of(text));
}

void stop_library_update(Call &c) {
    Device *d = device_of_protocol(c, 2);
    if (d == nullptr) return;
    d->media.updates = false;
    c.reply_int(0);
}

// [mlid, revision]: continues from the client's revision of that library.
void resume_library_update(Call &c) {
    Device *d = device_of_protocol(c, 2);
    if (d == nullptr) return;
    std::string mlid, revision;
    if (!value_as_string(array_item(c.arg, 0), &mlid) ||
        !value_as_string(array_item(c.arg, 1), &revision))
        return c.fail("RESUME_LIB_UPDATE needs two texts: library, revision");
    start_updates(c, *d, mlid == d->spec.library.mlid ? revision_of(revision) : 0);
}

// ---- Genius and play lists ----------------------------------------------------------------

// [a, b]: a Genius mix seeded by track a of the play queue; answers its index among the
// Genius mixes.
void create_genius_playlist(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t index = 0;
    if (!int_at(c, 0, &index)) return c.fail("CREATE_GENIUS_PLAYLIST needs two integers");
    if (index < 0 || index >= static_cast<int32_t>(d->spec.tracks.size()))
        return c.fail("no track " + std::to_string(index) + " in the play queue");
    MediaLibrary &lib = d->spec.library;
    if (lib.create_genius_playlist(d->spec.tracks[static_cast<size_t>(index)].uid) == 0)
        return c.fail("Genius is not available for this track");
    c.reply_int(lib.count(kCategoryGeniusMixes, {}) - 1);
    push_library_updates(c.world, *d);
}

void refresh_genius_playlist(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t index = 0;
    if (!value_as_int(c.arg, &index)) return c.fail("REFRESH_GENIUS_PLAYLIST needs an integer");
    if (index < 0 || index >= d->spec.library.count(kCategoryGeniusMixes, {}))
        return c.fail("no Genius mix " + std::to_string(index));
    c.reply_int(0);
}

// [a, b]: track a of the play queue.
void genius_available(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t index = 0;
    if (!int_at(c, 0, &index)) return c.fail("IS_GENIUS_AVAILABLEFORTRACK needs two integers");
    const bool in_queue = index >= 0 && index < static_cast<int32_t>(d->spec.tracks.size());
    const LibraryTrack *t =
        in_queue ? d->spec.library.track(d->spec.tracks[static_cast<size_t>(index)].uid) : nullptr;
    const int32_t available = d->spec.library.genius_available && t != nullptr && !t->genre.empty();
    c.reply(HashBuilder()
                .add("is_genius_availablefortrack", available)
                .add("result", available)
                .take());
}

// [a, b]: play list a (index among the play lists); status 0, type 1 for a Genius mix,
// data the number of tracks (at most 255).
void playlist_info(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t index = 0;
    if (!int_at(c, 0, &index)) return c.fail("GET_PLAYLIST_INFO needs two integers");
    const auto &lists = d->spec.library.playlists();
    if (index < 0 || index >= static_cast<int32_t>(lists.size()))
        return c.reply(HashBuilder().add("playlist_info", 0).take());
    const Playlist &p = lists[static_cast<size_t>(index)];
    const auto size = static_cast<int32_t>(p.tracks.size());
    c.reply(HashBuilder()
                .add("playlist_info", 1)
                .add("status", 0)
                .add("type", p.genius ? 1 : 0)
                .add("data", size < 255 ? size : 255)
                .take());
}

// ---- Update events ------------------------------------------------------------------------

gval *track_item(const LibraryTrack &t) {
    return HashBuilder()
        .add("uid", uid_value(t.uid).release())
        .add("title", t.title)
        .add("artist", t.artist)
        .add("album", t.album)
        .add("genre", t.genre)
        .add("composer", t.composer)
        .add("length_ms", t.length_ms)
        .take()
        .release();
}

gval *playlist_items(const MediaLibrary &lib) {
    gval *lists = serialize_array_reserve(static_cast<uint32_t>(lib.playlists().size()));
    for (const Playlist &p : lib.playlists()) {
        gval *members = serialize_array_reserve(static_cast<uint32_t>(p.tracks.size()));
        for (uint64_t uid : p.tracks) serialize_array_add(members, uid_value(uid).release());
        serialize_array_add(lists, HashBuilder()
                                       .add("uid", uid_value(p.uid).release())
                                       .add("name", p.name)
                                       .add("genius", p.genius ? 1 : 0)
                                       .add("items", members)
                                       .take()
                                       .release());
    }
    return lists;
}

}  // namespace

// One event per kItemsPerUpdate items (at least one, so that a stream that starts up to date
// still learns its revision); the first carries the reset flag, deletions and play lists.
void push_library_updates(World &world, Device &d) {
    MediaSession &m = d.media;
    if (!m.updates) return;
    const MediaLibrary &lib = d.spec.library;
    std::vector<LibraryChange> changes;
    const bool reset = !lib.changes_since(m.sent_revision, &changes);
    std::vector<const LibraryTrack *> inserted;
    std::vector<uint64_t> deleted;
    bool playlists = reset;
    if (reset) {
        for (const LibraryTrack &t : lib.tracks()) inserted.push_back(&t);
    } else {
        for (const LibraryChange &change : changes) {
            for (uint64_t uid : change.inserted)
                if (const LibraryTrack *t = lib.track(uid)) inserted.push_back(t);
            deleted.insert(deleted.end(), change.deleted.begin(), change.deleted.end());
            playlists = playlists || change.playlists_changed;
        }
    }
    const size_t parts =
        inserted.empty() ? 1 : (inserted.size() + kItemsPerUpdate - 1) / kItemsPerUpdate;
    for (size_t part = 0; part < parts; ++part) {
        HashBuilder data;
        data.add("mlid", lib.mlid)
            .add("revision", std::to_string(lib.revision))
            .add("reset", reset && part == 0 ? 1 : 0)
            .add("progress", static_cast<int32_t>((part + 1) * 100 / parts));
        const size_t from = part * kItemsPerUpdate;
        const size_t to = std::min(inserted.size(), from + kItemsPerUpdate);
        gval *items = serialize_array_reserve(static_cast<uint32_t>(to - from));
        for (size_t i = from; i < to; ++i) serialize_array_add(items, track_item(*inserted[i]));
        data.add("items", items);
        if (part == 0) {
            gval *gone = serialize_array_reserve(static_cast<uint32_t>(deleted.size()));
            for (uint64_t uid : deleted) serialize_array_add(gone, uid_value(uid).release());
            data.add("deleted", gone);
            if (playlists) data.add("playlists", playlist_items(lib));
        }
        world.emit(d, "medialibrary_update", data.take());
    }
    m.sent_revision = lib.revision;
}

void register_media_handlers(HandlerTable &table) {
    table[ZAL_OP_SET_HIERARCHY] = set_hierarchy;
    table[ZAL_OP_SET_CATEGORY] = set_category;
    table[ZAL_OP_SELECT_DB] = select_db;
    table[ZAL_OP_GET_DB_RECORDS] = get_records;
    table[ZAL_OP_INDEXED_TRACK_INFO] = indexed_track_info;
    table[ZAL_OP_GET_DB_ITUNES_INFO] = itunes_info;
    table[ZAL_OP_GET_DB_TRACK_INFO] = db_track_info;
    table[ZAL_OP_GET_PB_TRACK_INFO] = pb_track_info;
    table[ZAL_OP_PREPARE_UID_LIST] = prepare_uid_list;
    table[ZAL_OP_PLAY_UID_LIST] = play_uid_list;
    table[ZAL_OP_MEDIA_LIB_UID] = media_library_uid;
    table[ZAL_OP_PLAYITEMS] = play_items;
    table[ZAL_OP_PLAYCOLLECTION] = play_collection;
    table[ZAL_OP_SET_UPDATE_ITEMS] = set_update_items;
    table[ZAL_OP_START_LIB_UPDATE] = start_library_update;
    table[ZAL_OP_STOP_LIB_UPDATE] = stop_library_update;
    table[ZAL_OP_RESUME_LIB_UPDATE] = resume_library_update;
    table[ZAL_OP_CREATE_GENIUS_PLAYLIST] = create_genius_playlist;
    table[ZAL_OP_REFRESH_GENIUS_PLAYLIST] = refresh_genius_playlist;
    table[ZAL_OP_IS_GENIUS_AVAILABLEFORTRACK] = genius_available;
    table[ZAL_OP_GET_PLAYLIST_INFO] = playlist_info;
}

}  // namespace sim
