// The device's media library: db (walking an iAP1 device's database record by record and
// playing a track of it), library updates (following an iAP2 device's update stream),
// playlist (listing or playing a play list on either kind of device) and play-items.
#include <strings.h>

#include <cerrno>
#include <cinttypes>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <vector>

#include "zalctl.h"

namespace zalctl {

namespace {

constexpr int kCategoryTop = 0;
constexpr int kCategoryPlaylist = 1;
constexpr int kCategoryTrack = 5;
constexpr int kCollectionPlaylist = 0;

// Category names as the device numbers them.
constexpr const char *kCategoryNames[] = {"TOP",     "PLAYLIST",        "ARTIST",       "ALBUM",
                                          "GENRE",   "TRACK",           "COMPOSER",     "AUDIOBOOK",
                                          "PODCAST", "NESTED_PLAYLIST", "GENIUS_MIXES", "ITUNES_U"};
constexpr int kCategoryCount = 12;

int protocol_of(Session &s) {
    zal_ipod_handle *h = s.with_session();
    return zal_ipod_device_protocol(h, s.options.device);
}

zal_ipod_handle *iap1_session(Session &s, const char *what) {
    zal_ipod_handle *h = s.with_session();
    if (zal_ipod_device_protocol(h, s.options.device) != 1)
        throw Failure(std::string(what) + ": device " + std::to_string(s.options.device) +
                      " is not an iAP1 device (its library is read with 'library updates')");
    return h;
}

std::string uid_text(const uint8_t *b) {
    char text[19];
    uint64_t v = 0;
    for (int i = 0; i < 8; ++i) v = (v << 8) | b[i];
    snprintf(text, sizeof text, "0x%016" PRIx64, v);
    return text;
}

uint64_t uid_of(const gval *bytes) {
    uint32_t length = 0;
    const auto *b = static_cast<const uint8_t *>(
        serialize_type(bytes) == SERIALIZE_BYTES ? serialize_get_bytes(bytes, &length) : nullptr);
    uint64_t v = 0;
    for (uint32_t i = 0; b != nullptr && i < length && i < 8; ++i) v = (v << 8) | b[i];
    return v;
}

// Reads records offset..offset+count-1 of the category set last; their names in order.
std::vector<std::string> read_records(Session &s, zal_ipod_handle *h, int offset, int count) {
    std::vector<std::string> names;
    if (count <= 0) return names;
    if (s.expect(zal_ipod_get_records_sync(h, offset, count), "db records") != 1)
        throw Failure("db records: the device marked the records as not valid");
    for (int i = offset; i < offset + count; ++i) names.push_back(zal_ipod_record(h, i));
    return names;
}

void print_records(Session &s, int category, int total, int offset,
                   const std::vector<std::string> &names) {
    if (s.options.json) {
        Json items = Json::array();
        for (size_t i = 0; i < names.size(); ++i)
            items.push_back(Json{{"index", offset + static_cast<int>(i)}, {"name", names[i]}});
        print_json(Json{{"category", kCategoryNames[category]},
                        {"total", total},
                        {"offset", offset},
                        {"records", items}});
        return;
    }
    printf("%s: %d records\n", kCategoryNames[category], total);
    for (size_t i = 0; i < names.size(); ++i)
        printf("%5d  %s\n", offset + static_cast<int>(i), names[i].c_str());
}

int category_number(const std::string &text) {
    for (int c = 0; c < kCategoryCount; ++c)
        if (strcasecmp(text.c_str(), kCategoryNames[c]) == 0) return c;
    char *end = nullptr;
    const long n = strtol(text.c_str(), &end, 10);
    if (!text.empty() && *end == '\0' && n >= 0 && n < kCategoryCount) return static_cast<int>(n);
    throw Failure("unknown category \"" + text + "\" (a number 0-11 or a name like ALBUM)");
}

void print_now_playing(Session &s, const char *command, int result) {
    const Json np = now_playing(s);
    if (s.options.json)
        print_json(Json{{"command", command}, {"result", result}, {"now_playing", np}});
    else
        printf("%s\n", now_playing_line(np).c_str());
}

// ---- db -------------------------------------------------------------------------------------

struct DbOptions {
    std::string category;
    int offset = 0;
    int count = -1;  // -1: all
    int record = 0;
};

void db_categories(Session &s) {
    zal_ipod_handle *h = iap1_session(s, "db categories");
    const int total = s.expect(zal_ipod_set_category_sync(h, kCategoryTop), "db categories");
    print_records(s, kCategoryTop, total, 0, read_records(s, h, 0, total));
}

void db_records(Session &s, const DbOptions &o) {
    zal_ipod_handle *h = iap1_session(s, "db records");
    const int category = category_number(o.category);
    const int total = s.expect(zal_ipod_set_category_sync(h, category), "db records");
    const int offset = o.offset < total ? o.offset : total;
    const int count = o.count < 0 || offset + o.count > total ? total - offset : o.count;
    print_records(s, category, total, offset, read_records(s, h, offset, count));
}

// Narrows the walk to a record of the current category and moves to another category.
void db_select(Session &s, const DbOptions &o) {
    zal_ipod_handle *h = iap1_session(s, "db select");
    const int category = category_number(o.category);
    const int count = s.expect(zal_ipod_select_db_sync(h, o.record, category), "db select");
    if (s.options.json)
        print_json(
            Json{{"record", o.record}, {"category", kCategoryNames[category]}, {"total", count}});
    else
        printf("record %d selected; %s: %d records\n", o.record, kCategoryNames[category], count);
}

// Plays track record n of the walk's track listing.
void db_play(Session &s, const DbOptions &o) {
    zal_ipod_handle *h = iap1_session(s, "db play");
    s.expect(zal_ipod_set_category_sync(h, kCategoryTrack), "db play");
    const int result = s.expect(zal_ipod_select_db_sync(h, o.record, kCategoryTrack), "db play");
    print_now_playing(s, "db play", result);
}

// Full track records of the walk's track listing.
void db_tracks(Session &s, const DbOptions &o) {
    zal_ipod_handle *h = iap1_session(s, "db tracks");
    const int total = s.expect(zal_ipod_set_category_sync(h, kCategoryTrack), "db tracks");
    const int offset = o.offset < total ? o.offset : total;
    const int count = o.count < 0 || offset + o.count > total ? total - offset : o.count;
    s.expect(zal_ipod_get_db_track_info_sync(h, offset, count, 0), "db tracks");
    const gval *r = zal_ipod_get_result_db_track_info(h);
    Json tracks = Json::array();
    for (int i = 0; i < zal_ipod_get_result_db_track_info_count(r); ++i) {
        const char *name = "", *artist = "", *album = "";
        int duration = -1;
        const uint8_t *uid = nullptr;
        zal_ipod_get_result_db_track_info_name(r, i, &name);
        zal_ipod_get_result_db_track_info_artist(r, i, &artist);
        zal_ipod_get_result_db_track_info_album(r, i, &album);
        zal_ipod_get_result_db_track_info_duration(r, i, &duration);
        const std::string id =
            zal_ipod_get_result_db_track_info_uid(r, i, &uid) ? uid_text(uid) : "";
        if (s.options.json) {
            tracks.push_back(Json{{"index", offset + i},
                                  {"uid", id},
                                  {"name", name},
                                  {"artist", artist},
                                  {"album", album},
                                  {"duration_ms", duration}});
        } else {
            printf("%5d  %s  %s - %s (%s) %s\n", offset + i, id.c_str(), name, artist, album,
                   format_time(duration).c_str());
        }
    }
    if (s.options.json) print_json(Json{{"total", total}, {"tracks", tracks}});
}

// ---- library updates ------------------------------------------------------------------------

struct UpdateOptions {
    std::string from;  // the revision held; empty: none (the whole library comes)
    bool follow = false;
    double seconds = 10.0;
    bool items = false;  // print every item, not only the summary of each event
};

// What the update stream said, gathered for playlist.
struct LibraryView {
    std::string mlid;
    std::string revision;
    std::map<uint64_t, std::string> titles;
    std::vector<std::pair<std::string, std::pair<uint64_t, size_t>>> playlists;  // name, id, size
    bool complete = false;
};

const char *text_at(const gval *hash, const char *key) {
    const gval *v = serialize_hash_get(hash, key);
    return serialize_type(v) == SERIALIZE_STRING ? serialize_get_string(v) : "";
}
int int_at(const gval *hash, const char *key) {
    const gval *v = serialize_hash_get(hash, key);
    return serialize_type(v) == SERIALIZE_INT ? serialize_get_int(v) : 0;
}

void take_update(LibraryView &view, const gval *data) {
    view.mlid = text_at(data, "mlid");
    view.revision = text_at(data, "revision");
    const gval *items = serialize_hash_get(data, "items");
    for (int i = 0; i < serialize_array_count(items); ++i) {
        const gval *item = serialize_array_get(items, static_cast<uint32_t>(i));
        view.titles[uid_of(serialize_hash_get(item, "uid"))] = text_at(item, "title");
    }
    const gval *lists = serialize_hash_get(data, "playlists");
    if (lists != nullptr) view.playlists.clear();
    for (int i = 0; i < serialize_array_count(lists); ++i) {
        const gval *p = serialize_array_get(lists, static_cast<uint32_t>(i));
        view.playlists.push_back(
            {text_at(p, "name"),
             {uid_of(serialize_hash_get(p, "uid")),
              static_cast<size_t>(serialize_array_count(serialize_hash_get(p, "items")))}});
    }
    if (int_at(data, "progress") >= 100) view.complete = true;
}

void print_update(Session &s, const UpdateOptions &o, const gval *data) {
    if (s.options.json) {
        print_json(to_json(data));
        return;
    }
    const gval *items = serialize_hash_get(data, "items");
    const gval *gone = serialize_hash_get(data, "deleted");
    const gval *lists = serialize_hash_get(data, "playlists");
    printf("revision %s%s: %d%% +%d items -%d items%s\n", text_at(data, "revision"),
           int_at(data, "reset") ? " (reset)" : "", int_at(data, "progress"),
           serialize_array_count(items), serialize_array_count(gone),
           lists != nullptr
               ? (" " + std::to_string(serialize_array_count(lists)) + " play lists").c_str()
               : "");
    if (!o.items) return;
    for (int i = 0; i < serialize_array_count(items); ++i) {
        const gval *item = serialize_array_get(items, static_cast<uint32_t>(i));
        char id[19];
        snprintf(id, sizeof id, "0x%016" PRIx64, uid_of(serialize_hash_get(item, "uid")));
        printf("  + %s  %s - %s\n", id, text_at(item, "title"), text_at(item, "artist"));
    }
    for (int i = 0; i < serialize_array_count(gone); ++i) {
        char id[19];
        snprintf(id, sizeof id, "0x%016" PRIx64,
                 uid_of(serialize_array_get(gone, static_cast<uint32_t>(i))));
        printf("  - %s\n", id);
    }
}

// Starts the stream and hands each update to take; until the first transfer is complete
// (or, with follow, until interrupted or the time is up).
void follow_updates(Session &s, const std::string &from, bool follow, double seconds,
                    const std::function<void(const gval *)> &take, LibraryView &view) {
    s.on_event([&take](const zal_ipod_event &e) {
        if (zal_ipod_event_type(&e) == ZALIPOD_EVENT_MEDIALIBRARYUPDATE && e.data != nullptr &&
            serialize_type(e.data) == SERIALIZE_HASH)
            take(e.data);
    });
    zal_ipod_handle *h = s.with_session();
    if (zal_ipod_device_protocol(h, s.options.device) != 2)
        throw Failure("library updates: device " + std::to_string(s.options.device) +
                      " is not an iAP2 device (walk its database with 'db')");
    zal_ipod_start_library_update_sync(h, from.c_str());  // reports 0 whatever came back
    const auto end = std::chrono::steady_clock::now() +
                     std::chrono::milliseconds(static_cast<int64_t>(seconds * 1000));
    if (!s.pump_until(end, [&] { return !follow && view.complete; }))
        throw Failure("library updates: the connection to the daemon was lost");
    if (!follow && !view.complete)
        throw Failure("library updates: the library did not arrive within " +
                      std::to_string(static_cast<int>(seconds)) + " s");
}

void library_updates(Session &s, const UpdateOptions &o) {
    LibraryView view;
    follow_updates(
        s, o.from, o.follow, o.seconds,
        [&](const gval *data) {
            take_update(view, data);
            print_update(s, o, data);
            fflush(stdout);
        },
        view);
}

// ---- playlist and play-items ----------------------------------------------------------------

struct PlaylistOptions {
    std::string name;  // empty: list them
    int start = 0;
};

void playlist_iap1(Session &s, const PlaylistOptions &o) {
    zal_ipod_handle *h = s.with_session();
    const int total = s.expect(zal_ipod_set_category_sync(h, kCategoryPlaylist), "playlist");
    const std::vector<std::string> names = read_records(s, h, 0, total);
    if (o.name.empty()) {
        print_records(s, kCategoryPlaylist, total, 0, names);
        return;
    }
    for (size_t i = 0; i < names.size(); ++i) {
        if (names[i] != o.name) continue;
        const int tracks =
            s.expect(zal_ipod_select_db_sync(h, static_cast<int>(i), kCategoryTrack), "playlist");
        if (o.start >= tracks)
            throw Failure("playlist: \"" + o.name + "\" has " + std::to_string(tracks) + " tracks");
        const int result =
            s.expect(zal_ipod_select_db_sync(h, o.start, kCategoryTrack), "playlist");
        print_now_playing(s, "playlist", result);
        return;
    }
    throw Failure("playlist: no play list named \"" + o.name + "\"");
}

void playlist_iap2(Session &s, const PlaylistOptions &o) {
    LibraryView view;
    follow_updates(
        s, "", false, s.options.timeout_s, [&view](const gval *data) { take_update(view, data); },
        view);
    if (o.name.empty()) {
        if (s.options.json) {
            Json lists = Json::array();
            for (const auto &[name, info] : view.playlists)
                lists.push_back(Json{{"name", name}, {"tracks", info.second}});
            print_json(
                Json{{"mlid", view.mlid}, {"revision", view.revision}, {"playlists", lists}});
        } else {
            for (const auto &[name, info] : view.playlists)
                printf("%s (%zu tracks)\n", name.c_str(), info.second);
        }
        return;
    }
    for (const auto &[name, info] : view.playlists) {
        if (name != o.name) continue;
        const int result =
            s.expect(zal_play_collection_sync(s.handle(), info.first, kCollectionPlaylist, o.start,
                                              view.mlid.c_str()),
                     "playlist");
        print_now_playing(s, "playlist", result);
        return;
    }
    throw Failure("playlist: no play list named \"" + o.name + "\"");
}

void playlist(Session &s, const PlaylistOptions &o) {
    if (protocol_of(s) == 1)
        playlist_iap1(s, o);
    else
        playlist_iap2(s, o);
}

uint64_t parse_uid(const std::string &text) {
    char *end = nullptr;
    errno = 0;
    const unsigned long long v = strtoull(text.c_str(), &end, 0);
    if (text.empty() || *end != '\0' || errno != 0 || text[0] == '-')
        throw Failure("play-items: \"" + text + "\" is not an identifier (decimal or 0x...)");
    return v;
}

// iAP2 plays the list itself; iAP1 prepares it and plays it from the first identifier.
void play_items(Session &s, const std::vector<std::string> &texts, int start) {
    std::vector<uint64_t> uids;
    for (const std::string &t : texts) uids.push_back(parse_uid(t));
    if (start < 0 || start >= static_cast<int>(uids.size()))
        throw Failure("play-items: --start is not in the list");
    zal_ipod_handle *h = s.with_session();
    int result = 0;
    if (zal_ipod_device_protocol(h, s.options.device) == 1) {
        std::vector<uint8_t> bytes;
        for (uint64_t uid : uids)
            for (int b = 7; b >= 0; --b) bytes.push_back(static_cast<uint8_t>(uid >> (8 * b)));
        s.expect(
            zal_ipod_prepare_uid_list_sync(h, 0, 0, static_cast<int>(bytes.size()), bytes.data()),
            "play-items");
        result = s.expect(zal_ipod_play_uid_list_sync(h, bytes.data() + 8 * start), "play-items");
    } else {
        result = s.expect(zal_play_items_sync(h, uids.data(), static_cast<int>(uids.size()), start),
                          "play-items");
    }
    print_now_playing(s, "play-items", result);
}

}  // namespace

void add_media_commands(CLI::App &app, Session &s) {
    // Option storage lives as long as the App (main's scope), as CLI11 requires.
    static DbOptions db_options;
    CLI::App *db = app.add_subcommand("db", "Walk an iAP1 device's media database");
    db->require_subcommand(1);
    on_run(db->add_subcommand("categories", "Start the walk again and list the categories"), s,
           [&s] { db_categories(s); });
    CLI::App *records = db->add_subcommand("records", "List the records of CATEGORY");
    records->add_option("CATEGORY", db_options.category, "A number 0-11 or a name like ALBUM")
        ->required();
    records->add_option("--offset", db_options.offset, "First record")
        ->check(CLI::NonNegativeNumber);
    records->add_option("--count", db_options.count, "How many (default: all)")
        ->check(CLI::NonNegativeNumber);
    on_run(records, s, [&s] { db_records(s, db_options); });
    CLI::App *select = db->add_subcommand(
        "select", "Narrow the walk to RECORD of the category listed last and go to CATEGORY");
    select->add_option("RECORD", db_options.record, "Record index")
        ->required()
        ->check(CLI::NonNegativeNumber);
    select->add_option("CATEGORY", db_options.category, "Category to go to")->required();
    on_run(select, s, [&s] { db_select(s, db_options); });
    CLI::App *play = db->add_subcommand("play", "Play track RECORD of the walk's track listing");
    play->add_option("RECORD", db_options.record, "Track record index")
        ->required()
        ->check(CLI::NonNegativeNumber);
    on_run(play, s, [&s] { db_play(s, db_options); });
    CLI::App *tracks = db->add_subcommand("tracks", "Track records of the walk's track listing");
    tracks->add_option("--offset", db_options.offset, "First track")->check(CLI::NonNegativeNumber);
    tracks->add_option("--count", db_options.count, "How many (default: all)")
        ->check(CLI::NonNegativeNumber);
    on_run(tracks, s, [&s] { db_tracks(s, db_options); });

    static UpdateOptions update_options;
    CLI::App *library = app.add_subcommand("library", "An iAP2 device's media library");
    library->require_subcommand(1);
    CLI::App *updates =
        library->add_subcommand("updates", "Follow the library update stream: one line per update");
    updates->add_option("--from", update_options.from,
                        "Revision already held (default: none, the whole library comes)");
    updates->add_flag("-f,--follow", update_options.follow, "Keep following until interrupted");
    updates->add_option("--for", update_options.seconds, "Longest wait, in seconds (default 10)")
        ->check(CLI::PositiveNumber);
    updates->add_flag("--items", update_options.items, "Print every item added or deleted");
    on_run(updates, s, [&s] { library_updates(s, update_options); });

    static PlaylistOptions playlist_options;
    CLI::App *pl =
        app.add_subcommand("playlist", "List the play lists, or play the one named NAME");
    pl->add_option("NAME", playlist_options.name, "Play list to play");
    pl->add_option("--start", playlist_options.start, "Track of the list to start with")
        ->check(CLI::NonNegativeNumber);
    on_run(pl, s, [&s] { playlist(s, playlist_options); });

    static std::vector<std::string> uids;
    static int start = 0;
    CLI::App *items = app.add_subcommand("play-items", "Play tracks by identifier");
    items->add_option("UID", uids, "Track identifiers (decimal or 0x...)")->required();
    items->add_option("--start", start, "Index of the identifier to start with")
        ->check(CLI::NonNegativeNumber);
    on_run(items, s, [&s] { play_items(s, uids, start); });
}

}  // namespace zalctl
