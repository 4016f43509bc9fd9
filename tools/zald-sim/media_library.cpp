// The media library model: generation, queries by category and filter, collections and the
// revision history.
#include "media_library.h"

#include <algorithm>
#include <cctype>
#include <initializer_list>
#include <set>
#include <string_view>

namespace sim {

namespace {

constexpr const char *kCategoryNames[kCategoryCount] = {
    "TOP",      "PLAYLIST",  "ARTIST",  "ALBUM",           "GENRE",        "TRACK",
    "COMPOSER", "AUDIOBOOK", "PODCAST", "NESTED_PLAYLIST", "GENIUS_MIXES", "ITUNES_U"};

// Stable identifiers of artists, albums, genres and composers (FNV-1a of category and
// name), kept apart from track and play list identifiers by their top byte.
uint64_t name_identifier(int32_t category, const std::string &name) {
    uint64_t h = 1469598103934665603ull;
    auto mix = [&h](unsigned char c) {
        h ^= c;
        h *= 1099511628211ull;
    };
    mix(static_cast<unsigned char>(category));
    for (unsigned char c : name) mix(c);
    return (h & 0x00ffffffffffffffull) | 0xc000000000000000ull;
}

// Joins pieces into one string. Appending in place also keeps GCC 12 at -O3 from a false
// -Wrestrict report on chains of operator+.
std::string join(std::initializer_list<std::string_view> pieces) {
    std::string out;
    for (std::string_view p : pieces) out.append(p);
    return out;
}

bool is_playlist_category(int32_t c) {
    return c == kCategoryPlaylist || c == kCategoryNestedPlaylist || c == kCategoryGeniusMixes;
}

bool is_track_category(int32_t c) {
    return c == kCategoryTrack || c == kCategoryAudiobook || c == kCategoryPodcast ||
           c == kCategoryItunesU;
}

bool of_kind(const LibraryTrack &t, int32_t category) {
    switch (category) {
        case kCategoryAudiobook:
            return t.audiobook;
        case kCategoryPodcast:
            return t.podcast;
        case kCategoryItunesU:
            return t.itunes_u;
        default:
            return !t.audiobook && !t.podcast && !t.itunes_u;
    }
}

// A small deterministic generator (the library must not change between runs or platforms).
class Lcg {
  public:
    explicit Lcg(uint32_t seed) : state_(seed * 2654435761u + 1) {}
    uint32_t next() {
        state_ = state_ * 1664525u + 1013904223u;
        return state_ >> 8;
    }
    uint32_t below(uint32_t n) { return next() % n; }

  private:
    uint32_t state_;
};

constexpr const char *kAdjectives[] = {
    "Silent", "Electric", "Golden", "Midnight", "Crimson", "Hollow", "Northern", "Velvet",
    "Broken", "Distant",  "Neon",   "Paper",    "Static",  "Wild",   "Quiet",    "Lunar"};
constexpr const char *kNouns[] = {"Harbor",  "Signal", "Engine",  "River",   "Garden", "Circuit",
                                  "Highway", "Mirror", "Canyon",  "Lantern", "Orbit",  "Echo",
                                  "Station", "Meadow", "Voltage", "Compass"};
constexpr const char *kGenres[] = {"Rock", "Jazz", "Electronic", "Classical",
                                   "Pop",  "Folk", "Hip-Hop",    "Ambient"};
constexpr const char *kComposers[] = {"A. Marlow", "B. Okafor",  "C. Lindqvist", "D. Ferreira",
                                      "E. Novak",  "F. Haddad",  "G. Tanaka",    "H. Moreau",
                                      "I. Petrov", "J. Castillo"};

template <std::size_t N>
const char *pick(Lcg &rng, const char *const (&words)[N]) {
    return words[rng.below(N)];
}

}  // namespace

int32_t category_by_name(const std::string &name) {
    std::string upper(name);
    for (char &c : upper) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    for (int32_t i = 0; i < kCategoryCount; ++i)
        if (upper == kCategoryNames[i]) return i;
    return -1;
}

const char *category_name(int32_t category) {
    return category >= 0 && category < kCategoryCount ? kCategoryNames[category] : "UNKNOWN";
}

int32_t collection_type_of(int32_t category) {
    switch (category) {
        case kCategoryPlaylist:
        case kCategoryGeniusMixes:
        case kCategoryNestedPlaylist:
            return 0;
        case kCategoryArtist:
            return 1;
        case kCategoryAlbum:
            return 2;
        case kCategoryGenre:
            return 4;
        case kCategoryComposer:
            return 5;
        default:
            return -1;
    }
}

int32_t category_of_collection_type(int32_t type) {
    switch (type) {
        case 0:
            return kCategoryPlaylist;
        case 1:
            return kCategoryArtist;
        case 2:
            return kCategoryAlbum;
        case 4:
            return kCategoryGenre;
        case 5:
            return kCategoryComposer;
        default:
            return -1;
    }
}

MediaLibrary MediaLibrary::generate(uint32_t seed, int32_t count) {
    MediaLibrary lib;
    Lcg rng(seed);
    const int32_t artists = std::max(1, count / 12);
    std::vector<std::string> artist_names;
    std::set<std::string> used;
    for (int32_t a = 0; a < artists; ++a) {
        std::string name;
        do {
            name = join({"The ", pick(rng, kAdjectives), " ", pick(rng, kNouns), "s"});
            if (used.count(name)) name = join({name, " ", std::to_string(a)});
        } while (used.count(name));
        used.insert(name);
        artist_names.push_back(name);
    }
    // Albums of about six tracks, each by one artist and of one genre.
    std::string album, artist, genre;
    int32_t left_on_album = 0, album_number = 0;
    for (int32_t i = 0; i < count; ++i) {
        if (left_on_album == 0) {
            artist = artist_names[rng.below(static_cast<uint32_t>(artists))];
            genre = pick(rng, kGenres);
            album = join({pick(rng, kNouns), " ", pick(rng, kAdjectives), " Vol. ",
                          std::to_string(++album_number)});
            left_on_album = 4 + static_cast<int32_t>(rng.below(5));
        }
        --left_on_album;
        LibraryTrack t;
        t.title = join({pick(rng, kAdjectives), " ", pick(rng, kNouns), " ", std::to_string(i + 1)});
        t.artist = artist;
        t.album = album;
        t.genre = genre;
        t.composer = pick(rng, kComposers);
        t.length_ms = 120000 + static_cast<int32_t>(rng.below(240)) * 1000;
        // A few spoken-word items, so that every category has something in it.
        if (i % 50 == 49) t.audiobook = true, t.genre = "Audiobooks";
        if (i % 50 == 48) t.podcast = true, t.genre = "Podcasts";
        if (i % 100 == 47) t.itunes_u = true, t.genre = "Lectures";
        lib.add_track(std::move(t));
    }
    // Play lists of random picks, and a Genius mix per genre that has enough tracks.
    constexpr const char *kPlaylists[] = {"Road Trip", "Focus",      "Evening",
                                          "Workout",   "Favourites", "Recently Added"};
    for (const char *name : kPlaylists) {
        Playlist p;
        p.name = name;
        const uint32_t n = lib.tracks_.empty() ? 0 : 10 + rng.below(20);
        for (uint32_t k = 0; k < n; ++k)
            p.tracks.push_back(
                lib.tracks_[rng.below(static_cast<uint32_t>(lib.tracks_.size()))].uid);
        lib.add_playlist(std::move(p));
    }
    for (const char *g : kGenres) {
        Playlist p;
        p.name = join({g, " Mix"});
        p.genius = true;
        for (const LibraryTrack &t : lib.tracks_)
            if (t.genre == g && p.tracks.size() < 25) p.tracks.push_back(t.uid);
        if (p.tracks.size() >= 5) lib.add_playlist(std::move(p));
    }
    return lib;
}

uint64_t MediaLibrary::next_uid() {
    return ++last_uid_;
}

const LibraryTrack *MediaLibrary::track(uint64_t uid) const {
    for (const LibraryTrack &t : tracks_)
        if (t.uid == uid) return &t;
    return nullptr;
}

const Playlist *MediaLibrary::playlist(uint64_t uid) const {
    for (const Playlist &p : playlists_)
        if (p.uid == uid) return &p;
    return nullptr;
}

uint64_t MediaLibrary::add_track(LibraryTrack track) {
    if (track.uid == 0 || this->track(track.uid) != nullptr) track.uid = next_uid();
    tracks_.push_back(std::move(track));
    return tracks_.back().uid;
}

uint64_t MediaLibrary::add_playlist(Playlist playlist) {
    if (playlist.uid == 0) playlist.uid = next_uid();
    playlists_.push_back(std::move(playlist));
    return playlists_.back().uid;
}

const std::string *MediaLibrary::field(const LibraryTrack &t, int32_t category) const {
    switch (category) {
        case kCategoryArtist:
            return &t.artist;
        case kCategoryAlbum:
            return &t.album;
        case kCategoryGenre:
            return &t.genre;
        case kCategoryComposer:
            return &t.composer;
        default:
            return is_track_category(category) ? &t.title : nullptr;
    }
}

bool MediaLibrary::keeps(const LibraryTrack &t, const Filter &filter) const {
    for (const FilterStep &step : filter) {
        if (step.category == kCategoryTop) continue;
        if (is_playlist_category(step.category)) {
            bool in_list = false;
            for (const Playlist &p : playlists_)
                if (p.name == step.name &&
                    std::find(p.tracks.begin(), p.tracks.end(), t.uid) != p.tracks.end())
                    in_list = true;
            if (!in_list) return false;
            continue;
        }
        const std::string *value = field(t, step.category);
        if (value == nullptr || *value != step.name) return false;
    }
    return true;
}

std::vector<const LibraryTrack *> MediaLibrary::tracks_under(const Filter &filter) const {
    std::vector<const LibraryTrack *> kept;
    // The innermost play list of the path gives the order.
    const Playlist *order = nullptr;
    for (const FilterStep &step : filter)
        if (is_playlist_category(step.category))
            for (const Playlist &p : playlists_)
                if (p.name == step.name) order = &p;
    if (order != nullptr) {
        for (uint64_t uid : order->tracks) {
            const LibraryTrack *t = track(uid);
            if (t != nullptr && keeps(*t, filter)) kept.push_back(t);
        }
        return kept;
    }
    for (const LibraryTrack &t : tracks_)
        if (keeps(t, filter)) kept.push_back(&t);
    return kept;
}

std::vector<std::string> MediaLibrary::items(int32_t category, const Filter &filter) const {
    std::vector<std::string> names;
    if (category == kCategoryTop) {
        for (int32_t c = 1; c < kCategoryCount; ++c) names.push_back(kCategoryNames[c]);
        return names;
    }
    const auto kept = tracks_under(filter);
    if (is_playlist_category(category)) {
        std::set<uint64_t> kept_uids;
        for (const LibraryTrack *t : kept) kept_uids.insert(t->uid);
        for (const Playlist &p : playlists_) {
            if (p.genius != (category == kCategoryGeniusMixes)) continue;
            for (uint64_t uid : p.tracks)
                if (kept_uids.count(uid)) {
                    names.push_back(p.name);
                    break;
                }
        }
        return names;
    }
    if (is_track_category(category)) {
        for (const LibraryTrack *t : kept)
            if (of_kind(*t, category)) names.push_back(t->title);
        return names;
    }
    std::set<std::string> seen;
    for (const LibraryTrack *t : kept) {
        const std::string *value = field(*t, category);
        if (value != nullptr && !value->empty() && seen.insert(*value).second)
            names.push_back(*value);
    }
    return names;
}

int32_t MediaLibrary::count(int32_t category, const Filter &filter) const {
    return static_cast<int32_t>(items(category, filter).size());
}

std::vector<const LibraryTrack *> MediaLibrary::listed(int32_t category,
                                                      const Filter &filter) const {
    std::vector<const LibraryTrack *> kept = tracks_under(filter);
    if (!is_track_category(category)) return kept;
    std::vector<const LibraryTrack *> tracks;
    for (const LibraryTrack *t : kept)
        if (of_kind(*t, category)) tracks.push_back(t);
    return tracks;
}

uint64_t MediaLibrary::identifier(int32_t category, const std::string &name) const {
    if (is_playlist_category(category)) {
        for (const Playlist &p : playlists_)
            if (p.name == name) return p.uid;
        return 0;
    }
    if (is_track_category(category)) {
        for (const LibraryTrack &t : tracks_)
            if (t.title == name) return t.uid;
        return 0;
    }
    for (const LibraryTrack &t : tracks_) {
        const std::string *value = field(t, category);
        if (value != nullptr && *value == name) return name_identifier(category, name);
    }
    return 0;
}

std::vector<const LibraryTrack *> MediaLibrary::collection(int32_t category, uint64_t id) const {
    std::vector<const LibraryTrack *> list;
    if (is_playlist_category(category)) {
        if (const Playlist *p = playlist(id))
            for (uint64_t uid : p->tracks)
                if (const LibraryTrack *t = track(uid)) list.push_back(t);
        return list;
    }
    for (const LibraryTrack &t : tracks_) {
        const std::string *value = field(t, category);
        if (value != nullptr && name_identifier(category, *value) == id) list.push_back(&t);
    }
    return list;
}

void MediaLibrary::insert(std::vector<LibraryTrack> added) {
    LibraryChange change;
    change.revision = ++revision;
    for (LibraryTrack &t : added) change.inserted.push_back(add_track(std::move(t)));
    history_.push_back(std::move(change));
}

int32_t MediaLibrary::remove(const std::vector<uint64_t> &uids) {
    LibraryChange change;
    change.revision = revision + 1;
    for (uint64_t uid : uids) {
        auto it = std::find_if(tracks_.begin(), tracks_.end(),
                               [uid](const LibraryTrack &t) { return t.uid == uid; });
        if (it == tracks_.end()) continue;
        tracks_.erase(it);
        change.deleted.push_back(uid);
        for (Playlist &p : playlists_) {
            auto before = p.tracks.size();
            p.tracks.erase(std::remove(p.tracks.begin(), p.tracks.end(), uid), p.tracks.end());
            if (p.tracks.size() != before) change.playlists_changed = true;
        }
    }
    if (change.deleted.empty()) return 0;
    revision = change.revision;
    const auto removed = static_cast<int32_t>(change.deleted.size());
    history_.push_back(std::move(change));
    return removed;
}

bool MediaLibrary::changes_since(uint32_t since, std::vector<LibraryChange> *out) const {
    out->clear();
    const uint32_t oldest = history_.empty() ? revision : history_.front().revision - 1;
    if (since < oldest || since > revision || since == 0) return false;
    for (const LibraryChange &c : history_)
        if (c.revision > since) out->push_back(c);
    return true;
}

uint64_t MediaLibrary::create_genius_playlist(uint64_t seed_uid) {
    const LibraryTrack *seed = track(seed_uid);
    if (!genius_available || seed == nullptr || seed->genre.empty()) return 0;
    Playlist p;
    p.name = "Genius: " + seed->title;
    p.genius = true;
    p.tracks.push_back(seed->uid);
    for (const LibraryTrack &t : tracks_)
        if (t.uid != seed->uid && t.genre == seed->genre && p.tracks.size() < 25)
            p.tracks.push_back(t.uid);
    LibraryChange change;
    change.revision = ++revision;
    change.playlists_changed = true;
    history_.push_back(change);
    return add_playlist(std::move(p));
}

}  // namespace sim
