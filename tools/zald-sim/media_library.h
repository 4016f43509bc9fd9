// A device's media library: tracks with persistent identifiers, play lists (some of them
// Genius mixes), the library's identifier and revision with the history of its changes.
// Queries name a category and a filter, the path of (category, name) pairs a browser walked,
// and answer item names, counts, tracks and collection identifiers; iAP1 record browsing,
// play commands and library updates are all answered from them.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace sim {

// Category numbers as the protocol uses them.
enum Category : int32_t {
    kCategoryTop = 0,
    kCategoryPlaylist = 1,
    kCategoryArtist = 2,
    kCategoryAlbum = 3,
    kCategoryGenre = 4,
    kCategoryTrack = 5,
    kCategoryComposer = 6,
    kCategoryAudiobook = 7,
    kCategoryPodcast = 8,
    kCategoryNestedPlaylist = 9,
    kCategoryGeniusMixes = 10,
    kCategoryItunesU = 11,
    kCategoryCount = 12,
};

// Category number of a name ("ARTIST", case-insensitive); -1 when unknown.
int32_t category_by_name(const std::string &name);
const char *category_name(int32_t category);

// Collection types of PLAYCOLLECTION by category; -1 for a category that is no collection.
int32_t collection_type_of(int32_t category);
// Category of a collection type (0 play list, 1 artist, 2 album, 4 genre, 5 composer), -1.
int32_t category_of_collection_type(int32_t type);

// What a track is called and how long it plays: the part that play-queue tracks and library
// records share.
struct TrackTags {
    std::string title;
    std::string artist;
    std::string album;
    std::string genre;
    std::string composer;
    int32_t length_ms = 180000;
    bool audiobook = false;
};

struct LibraryTrack : TrackTags {
    uint64_t uid = 0;
    bool podcast = false;
    bool itunes_u = false;
};

struct Playlist {
    uint64_t uid = 0;
    std::string name;
    std::vector<uint64_t> tracks;  // identifiers, in play order
    bool genius = false;           // a Genius mix
};

// One step of a browser's path: an item of a category.
struct FilterStep {
    int32_t category = kCategoryTop;
    std::string name;
};
using Filter = std::vector<FilterStep>;

// What one revision changed.
struct LibraryChange {
    uint32_t revision = 0;
    std::vector<uint64_t> inserted;  // tracks added or changed
    std::vector<uint64_t> deleted;
    bool playlists_changed = false;
};

class MediaLibrary {
  public:
    MediaLibrary() = default;
    // A library of `count` tracks spread over artists, albums, genres and composers, with
    // play lists and Genius mixes; the same seed gives the same library.
    static MediaLibrary generate(uint32_t seed, int32_t count);

    // Identifier of the library (MEDIA_LIB_UID) and its current revision.
    std::string mlid = "SIMLIB-0001";
    uint32_t revision = 1;
    bool genius_available = true;

    const std::vector<LibraryTrack> &tracks() const { return tracks_; }
    const std::vector<Playlist> &playlists() const { return playlists_; }
    const LibraryTrack *track(uint64_t uid) const;
    const Playlist *playlist(uint64_t uid) const;

    // Adds a track (a zero uid gets a fresh one) or a play list; returns the identifier.
    uint64_t add_track(LibraryTrack track);
    uint64_t add_playlist(Playlist playlist);

    // ---- Queries --------------------------------------------------------------------
    // Tracks that the filter keeps, in library order (in play list order when the filter
    // names a play list).
    std::vector<const LibraryTrack *> tracks_under(const Filter &filter) const;
    // Names of the items of a category under a filter, in a stable order: distinct field
    // values in order of first appearance for artists, albums, genres and composers; track
    // titles for TRACK, AUDIOBOOK, PODCAST and ITUNES_U; play list names for PLAYLIST,
    // NESTED_PLAYLIST and GENIUS_MIXES (those with a kept track); the category names
    // for TOP.
    std::vector<std::string> items(int32_t category, const Filter &filter) const;
    int32_t count(int32_t category, const Filter &filter) const;
    // The tracks a category lists under a filter, in the order of items(): for TRACK,
    // AUDIOBOOK, PODCAST and ITUNES_U the listed items themselves, for any other category
    // every track the filter keeps.
    std::vector<const LibraryTrack *> listed(int32_t category, const Filter &filter) const;
    // Identifier of a collection: a play list's, or a stable number for an artist, album,
    // genre or composer name; 0 when there is no such item.
    uint64_t identifier(int32_t category, const std::string &name) const;
    // The tracks of a collection, in play order; empty when unknown.
    std::vector<const LibraryTrack *> collection(int32_t category, uint64_t id) const;

    // ---- Changes (each makes a new revision) ----------------------------------------
    void insert(std::vector<LibraryTrack> tracks);
    // Removes tracks (and their play list entries); returns how many were there.
    int32_t remove(const std::vector<uint64_t> &uids);
    // Changes since a revision, oldest first; false when that revision is unknown (older
    // than the history, from the future, or another library) and a reset is needed.
    bool changes_since(uint32_t since, std::vector<LibraryChange> *out) const;
    // A new Genius mix seeded by a track (same genre); 0 when Genius is not available.
    uint64_t create_genius_playlist(uint64_t seed_uid);

  private:
    uint64_t next_uid();
    const std::string *field(const LibraryTrack &t, int32_t category) const;
    bool keeps(const LibraryTrack &t, const Filter &filter) const;

    std::vector<LibraryTrack> tracks_;
    std::vector<Playlist> playlists_;
    std::vector<LibraryChange> history_;
    uint64_t last_uid_ = 0x5100000000000000ull;
};

// A change a scenario makes to a library at a time.
struct TimedLibraryChange {
    int64_t at_ms = 0;
    std::vector<LibraryTrack> insert;
    std::vector<std::string> remove;  // track titles
};

// A device's browsing and update state, shared by every client's session on it, as the
// device keeps it.
struct MediaSession {
    int32_t hierarchy = 1;
    int32_t category = kCategoryTop;
    Filter filter;                   // records selected so far (iAP1 browsing)
    std::vector<uint64_t> prepared;  // identifier list of PREPARE_UID_LIST
    bool updates = false;            // library update stream running
    uint32_t sent_revision = 0;      // revision the stream has carried (0: none yet)
};

}  // namespace sim
