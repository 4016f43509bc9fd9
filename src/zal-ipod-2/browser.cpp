// The media browser: category names and the categories offered at each level, the filtered
// queries of iAP2 devices, the selection stack (select, undo, reset) walked over either
// protocol, track information of a track list, and playing the current selection as a
// collection, an identifier list or a database record.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <vector>

#include "common/log.h"
#include "common/value_internal.h"
#include "zal-ipod-2/browser_state.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"

namespace {

enum Category : int32_t {
    kTop = 0,
    kPlaylist = 1,
    kArtist = 2,
    kAlbum = 3,
    kGenre = 4,
    kTrack = 5,
    kComposer = 6,
    kAudiobook = 7,
    kPodcast = 8,
    kNestedPlaylist = 9,
    kGeniusMixes = 10,
    kItunesU = 11,
    kCategoryCount = 12,
};

// One table for both lookups: index = category number.
constexpr const char *kCategoryNames[kCategoryCount] = {
    "TOP",      "PLAYLIST",  "ARTIST",  "ALBUM",           "GENRE",        "TRACK",
    "COMPOSER", "AUDIOBOOK", "PODCAST", "NESTED_PLAYLIST", "GENIUS_MIXES", "ITUNES_U"};
constexpr const char *kUnknownCategory = "UNKNOWN";

struct CategoryRow {
    int32_t collection_type;  // PLAYCOLLECTION type, -1: not played as a collection
    const int32_t *offered;   // categories offered beneath an item of this category
    int32_t offered_count;
};

constexpr int32_t kAtTop[] = {kPlaylist,       kArtist,      kAlbum,     kGenre,
                              kTrack,          kComposer,    kAudiobook, kPodcast,
                              kNestedPlaylist, kGeniusMixes, kItunesU};
constexpr int32_t kUnderPlaylist[] = {kArtist, kAlbum, kGenre, kTrack, kComposer, kAudiobook};
constexpr int32_t kUnderGenre[] = {kArtist, kAlbum, kTrack, kComposer, kAudiobook};
constexpr int32_t kUnderArtist[] = {kAlbum, kTrack};
constexpr int32_t kUnderNested[] = {kTrack, kNestedPlaylist};
constexpr int32_t kUnderAlbum[] = {kTrack};

template <std::size_t N>
constexpr CategoryRow row(int32_t type, const int32_t (&list)[N]) {
    return {type, list, static_cast<int32_t>(N)};
}
constexpr CategoryRow leaf(int32_t type) {
    return {type, nullptr, 0};
}

// Index = category number. An item of TOP (its items are the category names) offers
// nothing beneath it: it is treated as a leaf, like any unknown category.
constexpr CategoryRow kCategories[kCategoryCount] = {
    leaf(-1),                // TOP
    row(0, kUnderPlaylist),  // PLAYLIST
    row(1, kUnderArtist),    // ARTIST
    row(2, kUnderAlbum),     // ALBUM
    row(4, kUnderGenre),     // GENRE
    leaf(-1),                // TRACK
    row(5, kUnderArtist),    // COMPOSER
    leaf(-1),                // AUDIOBOOK
    row(-1, kUnderAlbum),    // PODCAST
    row(-1, kUnderNested),   // NESTED_PLAYLIST
    leaf(0),                 // GENIUS_MIXES
    row(-1, kUnderAlbum),    // ITUNES_U
};

const CategoryRow *category_row(int32_t c) {
    return c >= 0 && c < kCategoryCount ? &kCategories[c] : nullptr;
}

int32_t collection_type(int32_t c) {
    const CategoryRow *r = category_row(c);
    return r != nullptr ? r->collection_type : -1;
}

constexpr const char *kErrCountCategories =
    "Can't count the categories without selecting an item first";
constexpr const char *kErrGetCategories =
    "Can't get the categories without selecting an item first";
constexpr const char *kErrCountItems = "Can't count items if a category is not selected";
constexpr const char *kErrSelectCategory =
    "Can't select a category without selecting an item first";
constexpr const char *kErrSelectItem = "Can't select an item without selecting a category first";
constexpr const char *kErrIndex = "Index out of bounds";
constexpr const char *kErrUndo =
    "Can't undo selected item or category without selecting something first";
constexpr const char *kErrTracksInfo =
    "Media lib category should be TRACK or AUDIOBOOK to be able to get track info";
// The stack has a fixed number of levels. A walk that would go deeper is refused like the
// other guard errors (error text, -1, stack and device untouched) instead of writing past
// the stack: a program that walks down without undoing learns it at once.
constexpr const char *kErrFull = "Can't select deeper than 256 levels";

constexpr int32_t kIap2 = 2;
constexpr int32_t kNoCategory = -1;

// The protocol of the session's device, read afresh; anything but iAP2 browses as iAP1.
int32_t read_protocol(zal_ipod_handle *h) {
    h->protocol = zal_ipod_device_protocol(h, h->current_session);
    return h->protocol;
}
bool iap2(const zal_ipod_handle *h) {
    return h->protocol == kIap2;
}

int guard(zal_ipod_handle *h, const char *text) {
    zal_set_error_message(h, text);
    return -1;
}

char *copy_text(const char *s) {
    return strdup(s != nullptr ? s : "");
}

// A NULL-terminated list of n new copies of text(i); nullptr (all freed) when out of memory.
template <typename Text>
char **new_list(int32_t n, Text text) {
    if (n < 0) return nullptr;
    auto **list = static_cast<char **>(calloc(static_cast<size_t>(n) + 1, sizeof(char *)));
    if (list == nullptr) return nullptr;
    for (int32_t i = 0; i < n; ++i) {
        list[i] = copy_text(text(i));
        if (list[i] == nullptr) {
            for (int32_t k = 0; k < i; ++k) free(list[k]);
            free(list);
            return nullptr;
        }
    }
    return list;
}

// An unsigned 64-bit number in text with automatic base (0x hexadecimal, leading 0 octal).
uint64_t parse_uid(const char *text) {
    return text != nullptr ? strtoull(text, nullptr, 0) : 0;
}

bool is_one_of(int32_t c, std::initializer_list<int32_t> set) {
    for (int32_t v : set)
        if (v == c) return true;
    return false;
}

// Sends a filtered query: its integers, then one string per level of the current filter.
int send_filtered(zal_ipod_handle *h, uint16_t opcode, std::initializer_list<int32_t> ints,
                  const char *function) {
    if (h == nullptr) return 0;
    const zal_browser_state &b = h->browser;
    return zal_cmd_send(h, opcode, zal_arg_ints_strings(ints, b.selection_name, b.selection_count),
                        function);
}

int32_t read_count_identifiers(zal_ipod_handle *, const gval *hash) {
    return zal_hash_int(hash, "count_item_identifiers", -1);
}
int32_t read_count_items(zal_ipod_handle *, const gval *hash) {
    return zal_hash_int(hash, "count_items_category", -1);
}
int32_t read_collection_id(zal_ipod_handle *h, const gval *hash) {
    const char *id = zal_hash_string(hash, "collection_id");
    if (id == nullptr) return -1;
    zal_replace_text(&h->browser.collection_id, id);
    return h->browser.collection_id != nullptr ? 1 : -1;
}

// Sends GET_ITEMS_CURRENT_CATEGORY and rebuilds the records cache from its reply.
int32_t fetch_items_current_category(zal_ipod_handle *h, int32_t offset, int32_t count) {
    const int tid = zal_ipod_get_items_current_category(h, offset, count);
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    const int32_t n = zal_browser_cache_items(h, reply, offset);
    reply_record_free(reply);
    return n;
}

// ---- Levels -------------------------------------------------------------------------------

void clear_level(zal_browser_state &b, int32_t level) {
    b.selection_is_item[level] = 0;
    b.selection_value[level] = -1;
    free(b.selection_name[level]);
    b.selection_name[level] = nullptr;
    b.selection_offset[level] = 0;
    b.selection_item_count[level] = -1;
}

// Top level kinds.
bool category_on_top(const zal_browser_state &b) {
    return b.selection_count % 2 == 1;
}
// The category from which the item on top was chosen, kNoCategory with nothing selected.
int32_t category_of_top_item(const zal_browser_state &b) {
    return b.selection_count >= 2 ? b.selection_value[b.selection_count - 2] : kNoCategory;
}

// After a category was selected beneath the walk for play: counts it and fetches all of its
// names from 0 into the records cache, as the page of the item level to come.
int32_t fetch_whole_list(zal_ipod_handle *h, const char *failure_text) {
    zal_browser_state &b = h->browser;
    const int32_t m = zal_ipod_media_lib_get_items_count(h);
    if (m < 0) return -1;
    const int32_t c = b.selection_count;  // a category is on top: c < kSelectionLevels
    b.selection_offset[c] = 0;
    if (iap2(h)) {
        b.selection_item_count[c] = m;
        fetch_items_current_category(h, 0, m);
        return 1;
    }
    const int32_t r = zal_ipod_get_records_sync(h, 0, m);
    if (r == 0) return 0;
    if (r < 0) {
        ZAL_LOGE(failure_text, r);
        return r;
    }
    return 1;
}

// Raises the reply time-out for a long list (one second per 25 entries) and restores it.
class TimeoutFor {
  public:
    TimeoutFor(zal_ipod_handle *h, int32_t entries) : h_(h), saved_(h->read_timeout_sec.load()) {
        const auto need = static_cast<uint32_t>((entries > 0 ? entries : 0) / 25 + 1);
        if (saved_ < need) h_->read_timeout_sec = need;
    }
    ~TimeoutFor() { h_->read_timeout_sec = saved_; }
    TimeoutFor(const TimeoutFor &) = delete;
    TimeoutFor &operator=(const TimeoutFor &) = delete;

  private:
    zal_ipod_handle *h_;
    uint32_t saved_;
};

void put_be64(uint8_t *p, uint64_t v) {
    for (int i = 0; i < 8; ++i) p[i] = static_cast<uint8_t>(v >> (8 * (7 - i)));
}

// ---- Playing --------------------------------------------------------------------------------

int32_t play_as_collection(zal_ipod_handle *h, int32_t category) {
    const zal_browser_state &b = h->browser;
    const char *id =
        zal_ipod_get_collection_identifier_sync(h, b.selection_name[0], b.selection_value[1]);
    if (id == nullptr) return -1;
    const uint64_t collection = parse_uid(id);
    // The identifier reply copies at most 128 bytes without room for a terminator of its
    // own; the last byte stays 0 so the text is always terminated (and fits the record).
    char mlid[MAXIMUM_MLID_LENGTH] = {};
    zal_ipod_get_media_library_unique_id_sync(h, mlid, MAXIMUM_MLID_LENGTH - 1);
    const int r = zal_play_collection_sync(h, collection, collection_type(category), 0, mlid);
    return r > 0 ? 1 : -1;
}

// Plays the identifiers of the page that the item on top was chosen from, from start (or
// from index when start is -1).
int32_t play_as_items(zal_ipod_handle *h, int32_t start, int32_t index) {
    zal_browser_state &b = h->browser;
    b.selection_count -= 1;
    const int32_t o = b.selection_offset[b.selection_count];
    const int32_t m = b.selection_item_count[b.selection_count];
    const char **ids = zal_ipod_get_item_identifiers_current_filter_sync(h, o, m, 1);
    b.selection_count += 1;
    if (ids == nullptr) return -1;
    // The reply may hold fewer identifiers than asked for: only those present are played.
    std::vector<uint64_t> numbers;
    for (int32_t i = 0; i < m && ids[i] != nullptr; ++i) numbers.push_back(parse_uid(ids[i]));
    free(static_cast<void *>(ids));
    if (start == -1) start = index;
    printf("TRACK INDEX: %d\n", start);
    const int r =
        zal_ipod_media_lib_play_items(h, numbers.data(), static_cast<int>(numbers.size()), start);
    return r > 0 ? 1 : -1;
}

// An item was just pushed on top: plays it.
int32_t play_selected_item(zal_ipod_handle *h, int32_t index) {
    const zal_browser_state &b = h->browser;
    if (!iap2(h)) {
        const int r = zal_ipod_select_db_sync(h, b.selection_value[b.selection_count - 1], kTrack);
        return r > 0 ? 1 : -1;
    }
    const int32_t k = category_of_top_item(b);
    if (b.selection_count == 2 &&
        is_one_of(k, {kPlaylist, kArtist, kAlbum, kGenre, kComposer, kGeniusMixes}))
        return play_as_collection(h, k);
    return play_as_items(h, -1, index);
}

// Selects TRACK beneath the item on top, fetches the whole track list and takes its first
// track.
int32_t select_first_track(zal_ipod_handle *h, const char *failure_text) {
    int32_t r = zal_ipod_media_lib_select_category(h, kTrack);
    if (r != 1) return r;
    r = fetch_whole_list(h, failure_text);
    if (r != 1) return r;
    return zal_ipod_media_lib_select_item(h, 0);
}

// ---- Track field accessors ----------------------------------------------------------------

// The last iAP2 track information list, when result is it; n its number of strings.
const char *const *iap2_tracks(zal_ipod_handle *h, const void *result, int32_t *n) {
    const zal_browser_state &b = h->browser;
    if (result == nullptr || result != b.tracks_info) return nullptr;
    *n = b.tracks_info_count;
    return static_cast<const char *const *>(result);
}

// The iAP1 result, when result is the handle's current DB track info.
const gval *iap1_tracks(zal_ipod_handle *h, const void *result) {
    return result != nullptr && result == h->records.db_track_info
               ? static_cast<const gval *>(result)
               : nullptr;
}

using Iap1Text = int (*)(const gval *, int, const char **);

// String field of track i: iAP2 six-string records at 6i + field, identifier-only lists
// give ""; iAP1 through the record accessor.
int text_field(zal_ipod_handle *h, const void *result, int i, int32_t field, Iap1Text iap1,
               char **text) {
    if (h == nullptr || text == nullptr || i < 0) return 0;
    if (iap2(h)) {
        int32_t n = 0;
        const char *const *list = iap2_tracks(h, result, &n);
        if (list == nullptr) return 0;
        const int64_t stride = h->browser.track_info_ids_only != 0 ? 1 : 6;
        const int64_t first = stride * i;
        if (first >= n) return 0;
        const char *s = stride == 1 || first + field >= n ? "" : list[first + field];
        *text = copy_text(s);
        return *text != nullptr ? 1 : 0;
    }
    const gval *records = iap1_tracks(h, result);
    const char *s = nullptr;
    if (records == nullptr || iap1(records, i, &s) != 1) return 0;
    *text = copy_text(s);
    return *text != nullptr ? 1 : 0;
}

}  // namespace

zal_browser_state::zal_browser_state() {
    for (int32_t level = 0; level < kSelectionLevels; ++level) {
        selection_value[level] = -1;
        selection_item_count[level] = -1;
    }
}

zal_browser_state::~zal_browser_state() {
    clear_levels();
    free(static_cast<void *>(tracks_info));
    serialize_free(identifiers);
    free(collection_id);
}

// Every level, not only those in use: an undo that failed part-way may leave names above
// selection_count.
void zal_browser_state::clear_levels() {
    for (int32_t level = 0; level < kSelectionLevels; ++level) clear_level(*this, level);
    selection_count = 0;
}

// The reply array [unused, name...] becomes the cache [1, 1, offset, n-1, name...] in place:
// the names stay the strings unserialize made (no copy, no allocation per name), only the
// four leading numbers are written in front of them.
int32_t zal_browser_cache_items(zal_ipod_handle *h, const zal_ipod_reply *reply, int32_t offset) {
    if (h == nullptr || reply == nullptr || reply->length == 0 || reply->payload == nullptr)
        return 0;
    gval *v = unserialize(reply->payload, reply->length);
    if (zal_kind(v) != SERIALIZE_ARRAY || serialize_array_count(v) < 1) {
        serialize_free(v);
        return 0;
    }
    const int32_t n = serialize_array_count(v);
    gval *cache = v;
    if (n == 1) {
        serialize_free(v);
        cache = zal_arg_ints({1, 1, offset, 0});
    } else {
        // [total, names...] becomes [1, 1, offset, n - 1, names...] with one move of the names.
        gval *header[] = {serialize_int(1), serialize_int(offset), serialize_int(n - 1)};
        serialize_array_set(v, 0, serialize_int(1));
        if (header[0] == nullptr || header[1] == nullptr || header[2] == nullptr) {
            for (gval *item : header)
                if (item != nullptr) serialize_free(item);
        } else {
            value_array_insert_many(v, 1, header, 3);
        }
    }
    // A failed allocation leaves the array short of its header: the old cache stays.
    if (cache == nullptr || serialize_array_count(cache) != n + 3) {
        ZAL_LOGE("out of memory for the names of %d items\n", n - 1);
        serialize_free(cache);
        return 0;
    }
    serialize_free(h->records.records);
    h->records.records = cache;
    return n;
}

extern "C" {

ZAL_API const char *zal_ipod_category_to_string(int category) {
    return category >= 0 && category < kCategoryCount ? kCategoryNames[category] : kUnknownCategory;
}

ZAL_API int zal_ipod_string_to_category(const char *name) {
    if (name == nullptr) return kTop;
    for (int32_t c = kPlaylist; c < kCategoryCount; ++c)
        if (strcmp(name, kCategoryNames[c]) == 0) return c;
    return kTop;
}

// ---- Filtered queries ---------------------------------------------------------------------

ZAL_API int zal_ipod_get_collection_identifier(zal_ipod_handle *h, const char *category_name,
                                               int item_index) {
    return zal_cmd_send(h, ZAL_OP_GET_COLLECTION_ID,
                        zal_arg_array({zal_arg_string(category_name), zal_arg_int(item_index)}),
                        __func__);
}
// The daemon's "error" text, when it sends one, is kept like any command's; the result is
// the same as for a reply without the key.
ZAL_API const char *zal_ipod_get_collection_identifier_sync(zal_ipod_handle *h,
                                                            const char *category_name,
                                                            int item_index) {
    if (h == nullptr) return nullptr;
    const int tid = zal_ipod_get_collection_identifier(h, category_name, item_index);
    return zal_cmd_sync_hash(h, tid, read_collection_id) == 1 ? h->browser.collection_id : nullptr;
}

ZAL_API int zal_ipod_count_item_identifiers_current_filter(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    return send_filtered(h, ZAL_OP_COUNT_ITEMS_IDENTIFIER_CURRENT_FILTER,
                         {h->browser.selection_count}, __func__);
}
ZAL_API int zal_ipod_count_item_identifiers_current_filter_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_hash(h, zal_ipod_count_item_identifiers_current_filter(h),
                             read_count_identifiers);
}

ZAL_API int zal_ipod_get_items_identifier_current_filter(zal_ipod_handle *h, int offset, int count,
                                                         int identifiers_only) {
    if (h == nullptr) return 0;
    return send_filtered(h, ZAL_OP_GET_ITEMS_IDENTIFIER_CURRENT_FILTER,
                         {h->browser.selection_count, offset, count, identifiers_only}, __func__);
}
// The pointers point into the decoded reply, which the handle keeps until the next query;
// an element that is not a string reads as "". The list ends with a NULL entry, so a reply
// shorter than asked for is never read past.
ZAL_API const char **zal_ipod_get_item_identifiers_current_filter_sync(zal_ipod_handle *h,
                                                                       int offset, int count,
                                                                       int identifiers_only) {
    if (h == nullptr) return nullptr;
    gval *v = zal_cmd_sync_value(
        h, zal_ipod_get_items_identifier_current_filter(h, offset, count, identifiers_only));
    if (zal_kind(v) != SERIALIZE_ARRAY || serialize_array_count(v) < 1) {
        serialize_free(v);
        return nullptr;
    }
    const int32_t n = serialize_array_count(v) - 1;
    auto **list = static_cast<const char **>(calloc(static_cast<size_t>(n) + 1, sizeof(char *)));
    if (list == nullptr) {
        serialize_free(v);
        return nullptr;
    }
    for (int32_t i = 0; i < n; ++i) {
        const gval *item = serialize_array_get(v, static_cast<uint32_t>(i) + 1);
        list[i] = zal_kind(item) == SERIALIZE_STRING ? serialize_get_string(item) : "";
    }
    // The track information list points into the reply being replaced: it goes with it.
    zal_browser_state &b = h->browser;
    free(static_cast<void *>(b.tracks_info));
    b.tracks_info = nullptr;
    b.tracks_info_count = 0;
    serialize_free(b.identifiers);
    b.identifiers = v;
    return list;
}

ZAL_API int zal_ipod_count_items_current_category(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    return send_filtered(h, ZAL_OP_COUNT_ITEMS_CURRENT_CATEGORY, {h->browser.selection_count},
                         __func__);
}
ZAL_API int zal_ipod_count_items_current_category_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_hash(h, zal_ipod_count_items_current_category(h), read_count_items);
}

ZAL_API int zal_ipod_get_items_current_category(zal_ipod_handle *h, int offset, int count) {
    if (h == nullptr) return 0;
    return send_filtered(h, ZAL_OP_GET_ITEMS_CURRENT_CATEGORY,
                         {h->browser.selection_count, offset, count}, __func__);
}
ZAL_API char **zal_ipod_get_items_current_category_sync(zal_ipod_handle *h, int offset, int count) {
    if (h == nullptr || count < 0) return nullptr;
    if (fetch_items_current_category(h, offset, count) == 0) return nullptr;
    return new_list(count, [h, offset](int32_t i) { return zal_ipod_record(h, offset + i); });
}

// ---- The current level --------------------------------------------------------------------

ZAL_API int zal_ipod_media_lib_get_categories_count(zal_ipod_handle *h) {
    if (h == nullptr) return -1;
    const zal_browser_state &b = h->browser;
    if (category_on_top(b)) return guard(h, kErrCountCategories);
    if (b.selection_count == 0) return static_cast<int>(std::size(kAtTop));
    const CategoryRow *r = category_row(category_of_top_item(b));
    return r != nullptr ? r->offered_count : 0;
}

ZAL_API char **zal_ipod_media_lib_get_categories(zal_ipod_handle *h) {
    if (h == nullptr) return nullptr;
    const zal_browser_state &b = h->browser;
    if (category_on_top(b)) {
        guard(h, kErrGetCategories);
        return nullptr;
    }
    const int32_t *list = kAtTop;
    int32_t n = static_cast<int32_t>(std::size(kAtTop));
    if (b.selection_count > 0) {
        const CategoryRow *r = category_row(category_of_top_item(b));
        list = r != nullptr ? r->offered : nullptr;
        n = r != nullptr ? r->offered_count : 0;
    }
    return new_list(n, [list](int32_t i) { return kCategoryNames[list[i]]; });
}

// Uses the protocol stored last (the caller walked here after reading it).
ZAL_API int zal_ipod_media_lib_get_items_count(zal_ipod_handle *h) {
    if (h == nullptr) return -1;
    zal_browser_state &b = h->browser;
    if (!category_on_top(b)) return guard(h, kErrCountItems);
    const int32_t count =
        iap2(h) ? zal_ipod_count_items_current_category_sync(h) : h->records.record_count;
    b.selection_item_count[b.selection_count - 1] = count;
    return count;
}

// A negative offset or count is no page of the category: NULL, like a page past its end.
// On iAP1 a records query that failed (no reply: -1, or not valid: 0) gives NULL too, so
// that names of an older page are never handed out as this one's.
ZAL_API char **zal_ipod_media_lib_get_items(zal_ipod_handle *h, int offset, int count) {
    if (h == nullptr || offset < 0 || count < 0) return nullptr;
    const int32_t total = zal_ipod_media_lib_get_items_count(h);
    if (static_cast<int64_t>(total) < static_cast<int64_t>(offset) + count) return nullptr;
    read_protocol(h);
    zal_browser_state &b = h->browser;
    const int32_t c = b.selection_count;  // odd, so below kSelectionLevels
    b.selection_offset[c] = offset;
    if (iap2(h)) {
        b.selection_item_count[c] = count;
        return zal_ipod_get_items_current_category_sync(h, offset, count);
    }
    if (zal_ipod_get_records_sync(h, offset, count) <= 0) return nullptr;
    return new_list(count, [h, offset](int32_t i) { return zal_ipod_record(h, offset + i); });
}

// ---- The selection stack ------------------------------------------------------------------

ZAL_API int zal_ipod_media_lib_reset_selection(zal_ipod_handle *h, int hierarchy) {
    if (h == nullptr) return 0;
    zal_browser_state &b = h->browser;
    b.clear_levels();
    read_protocol(h);
    int result = 1;
    if (iap2(h)) {
        h->records.hierarchy = hierarchy;
    } else {
        const int top = zal_ipod_set_category_sync(h, kTop);
        const int set = zal_ipod_set_hierarchy_sync(h, hierarchy);
        result = top > 0 && set > 0 ? 1 : 0;
    }
    b.selection_count = 0;
    b.selection_value[0] = -1;
    b.selection_item_count[0] = -1;
    return result;
}

ZAL_API int zal_ipod_media_lib_get_current_selection_count(zal_ipod_handle *h) {
    return h != nullptr ? h->browser.selection_count : 0;
}

ZAL_API char **zal_ipod_media_lib_get_current_selection(zal_ipod_handle *h) {
    if (h == nullptr) return nullptr;
    const zal_browser_state &b = h->browser;
    return new_list(b.selection_count, [&b](int32_t i) { return b.selection_name[i]; });
}

ZAL_API int zal_ipod_media_lib_get_current_selection_start_index(zal_ipod_handle *h) {
    if (h == nullptr) return 0;
    const zal_browser_state &b = h->browser;
    const int32_t c = b.selection_count;
    return c > 0 && b.selection_is_item[c - 1] != 0 ? b.selection_value[c - 1] : 0;
}

// The category number is passed through as given (an unknown one is named "UNKNOWN"); what
// it means beneath the item on top is the device's business.
ZAL_API int zal_ipod_media_lib_select_category(zal_ipod_handle *h, int category) {
    if (h == nullptr) return -1;
    zal_browser_state &b = h->browser;
    const int32_t c = b.selection_count;
    if (category_on_top(b)) return guard(h, kErrSelectCategory);
    if (c >= kSelectionLevels) return guard(h, kErrFull);
    read_protocol(h);
    int result = 1;
    if (!iap2(h)) {
        const int r = c > 0 ? zal_ipod_select_db_sync(h, b.selection_value[c - 1], category)
                            : zal_ipod_set_category_sync(h, category);
        result = r >= 0 ? 1 : 0;
    }
    clear_level(b, c);
    b.selection_value[c] = category;
    b.selection_is_item[c] = 0;
    b.selection_name[c] = copy_text(zal_ipod_category_to_string(category));
    b.selection_offset[c] = 0;
    b.selection_count = c + 1;
    return result;
}

ZAL_API int zal_ipod_media_lib_select_item(zal_ipod_handle *h, int index) {
    if (h == nullptr) return -1;
    zal_browser_state &b = h->browser;
    const int32_t c = b.selection_count;
    if (!category_on_top(b)) return guard(h, kErrSelectItem);
    if (c >= kSelectionLevels) return guard(h, kErrFull);
    const int64_t a = static_cast<int64_t>(index) + b.selection_offset[c];
    if (a < 0 || a >= b.selection_item_count[c - 1]) return guard(h, kErrIndex);
    const auto absolute = static_cast<int32_t>(a);
    b.selection_value[c] = absolute;
    b.selection_is_item[c] = 1;
    free(b.selection_name[c]);
    b.selection_name[c] = copy_text(zal_ipod_record(h, absolute));
    b.selection_count = c + 1;
    return 1;
}

// A rebuild that fails part-way keeps the levels rebuilt so far and clears the rest, so that
// no level above selection_count still holds a name of the old walk.
ZAL_API int zal_ipod_media_lib_undo_selection(zal_ipod_handle *h, int keep) {
    if (h == nullptr) return -1;
    zal_browser_state &b = h->browser;
    if (b.selection_count < 1 || b.selection_count <= keep || keep < 0) return guard(h, kErrUndo);
    if (keep == 0) return zal_ipod_media_lib_reset_selection(h, h->records.hierarchy);
    read_protocol(h);
    const int32_t old = b.selection_count;
    b.selection_count = 0;
    auto fail = [&b, old](int32_t from) {
        for (int32_t level = from; level < old; ++level) clear_level(b, level);
        return 0;
    };
    for (int32_t i = 0; i < old; ++i) {
        const bool item = b.selection_is_item[i] != 0;
        const int32_t value = b.selection_value[i];
        const int32_t offset = b.selection_offset[i];
        clear_level(b, i);
        if (i >= keep) continue;
        if (!item) {
            const int r = zal_ipod_media_lib_select_category(h, value);
            if (r != 1) {
                ZAL_LOGE("Can not select category! (%d)\n", r);
                return fail(i + 1);
            }
            continue;
        }
        const int m = zal_ipod_media_lib_get_items_count(h);
        if (m < 0) {
            ZAL_LOGE("Can not get items count! (%d)\n", m);
            return fail(i + 1);
        }
        b.selection_offset[b.selection_count] = offset;
        if (iap2(h)) {
            b.selection_item_count[b.selection_count] = m;
            fetch_items_current_category(h, offset, m);
        } else {
            const int r = zal_ipod_get_records_sync(h, offset, m);
            if (r == 0) return fail(i + 1);
            if (r < 0) {
                ZAL_LOGE("Can not get record datas on iAP1 (%d)\n", r);
                return fail(i + 1);
            }
        }
        const int r = zal_ipod_media_lib_select_item(h, value - offset);
        if (r != 1) {
            ZAL_LOGE("Can not select item (%d)\n", r);
            return fail(i + 1);
        }
    }
    return 1;
}

// ---- Playing ------------------------------------------------------------------------------

// A negative count plays nothing; a missing list with a count is refused (nothing sent).
ZAL_API int zal_ipod_media_lib_play_items(zal_ipod_handle *h, const uint64_t *uids, int count,
                                          int start) {
    if (h == nullptr) return 0;
    int32_t n = count < 0 ? 0 : count;
    if (n > ZAL_MEDIA_LIB_MAX_PLAY_ITEMS) n = ZAL_MEDIA_LIB_MAX_PLAY_ITEMS;
    if (uids == nullptr && n > 0) {
        ZAL_LOGE("%s: no identifiers; nothing sent\n", __func__);
        return 0;
    }
    read_protocol(h);
    if (start > n) return 0;
    if (iap2(h)) return zal_play_items_sync(h, uids, n, start);
    TimeoutFor longer(h, n);
    // One spare entry: the list of an empty selection still has a (zero) start identifier.
    std::vector<uint8_t> list(8 * (static_cast<size_t>(n) + 1), 0);
    for (int32_t i = 0; i < n; ++i) put_be64(&list[8 * static_cast<size_t>(i)], uids[i]);
    const size_t first = start >= 0 && start < n ? static_cast<size_t>(start) : 0;
    uint8_t start_uid[8];
    memcpy(start_uid, &list[8 * first], sizeof start_uid);
    const int r = zal_ipod_prepare_uid_list_sync(h, 0, 0, 8 * n, list.data());
    if (r != 1) return r;
    return zal_ipod_play_uid_list_sync(h, start_uid);
}

ZAL_API int zal_ipod_media_lib_play_current_selection(zal_ipod_handle *h, int index) {
    if (h == nullptr) return -1;
    zal_browser_state &b = h->browser;
    read_protocol(h);
    const int32_t c = b.selection_count;
    if (category_on_top(b)) {
        int32_t r = zal_ipod_media_lib_select_item(h, index);
        if (r != 1) return r;
        if (b.selection_value[c - 1] != kTrack) {
            r = select_first_track(h, "Can not get record datas. (%d)\n");
            if (r != 1) return r;
        }
        return play_selected_item(h, index);
    }
    const int32_t k = category_of_top_item(b);
    if (is_one_of(k, {kTrack, kAudiobook, kGeniusMixes})) {
        // The item on top is playable itself; index is absolute in k's item list.
        b.selection_value[c - 1] = index;
        free(b.selection_name[c - 1]);
        b.selection_name[c - 1] = copy_text(zal_ipod_record(h, index));
        if (!iap2(h)) return zal_ipod_select_db_sync(h, index, kTrack) > 0 ? 1 : -1;
        const int32_t start = index - b.selection_offset[c - 1];
        if (c == 2 && k == kGeniusMixes) return play_as_collection(h, k);
        return play_as_items(h, start, index);
    }
    if (iap2(h) && c == 2 && is_one_of(k, {kPlaylist, kArtist, kAlbum, kGenre, kComposer}))
        return play_as_collection(h, k);
    const int32_t r = select_first_track(h, "Can not get record data. (%d)\n");
    if (r != 1) return r;
    return play_selected_item(h, index);
}

// ---- Track information --------------------------------------------------------------------

// On iAP1 a request that failed gives NULL rather than the previous (other tracks') result.
ZAL_API const void *zal_ipod_media_lib_get_tracks_info(zal_ipod_handle *h, int identifiers_only,
                                                       int offset, int count) {
    if (h == nullptr) return nullptr;
    zal_browser_state &b = h->browser;
    const int32_t c = b.selection_count;
    if (!category_on_top(b) || !is_one_of(b.selection_value[c - 1], {kTrack, kAudiobook})) {
        guard(h, kErrTracksInfo);
        return nullptr;
    }
    b.track_info_ids_only = identifiers_only;
    if (iap2(h)) {
        const int total = zal_ipod_count_item_identifiers_current_filter_sync(h);
        if (static_cast<int64_t>(total) < static_cast<int64_t>(offset) + count) return nullptr;
        const char **list =
            zal_ipod_get_item_identifiers_current_filter_sync(h, offset, count, identifiers_only);
        if (list == nullptr) return nullptr;
        b.tracks_info = list;
        b.tracks_info_count = serialize_array_count(b.identifiers) - 1;
        return list;
    }
    TimeoutFor longer(h, count);
    if (zal_ipod_get_db_track_info_sync(h, offset, count, identifiers_only) != 1) return nullptr;
    return zal_ipod_get_result_db_track_info(h);
}

ZAL_API int zal_ipod_media_lib_get_track_uid(zal_ipod_handle *h, const void *result, int i,
                                             uint64_t *uid) {
    if (h == nullptr || uid == nullptr || i < 0) return 0;
    if (iap2(h)) {
        int32_t n = 0;
        const char *const *list = iap2_tracks(h, result, &n);
        const int64_t at = static_cast<int64_t>(i) * (h->browser.track_info_ids_only ? 1 : 6);
        if (list == nullptr || at >= n) return 0;
        *uid = parse_uid(list[at]);
        return 1;
    }
    const gval *records = iap1_tracks(h, result);
    const uint8_t *bytes = nullptr;
    if (records == nullptr || zal_ipod_get_result_db_track_info_uid(records, i, &bytes) != 1)
        return 0;
    uint64_t v = 0;
    for (int k = 0; k < 8; ++k) v = (v << 8) | bytes[k];
    *uid = v;
    return 1;
}

ZAL_API int zal_ipod_media_lib_get_track_duration(zal_ipod_handle *h, const void *result, int i,
                                                  uint32_t *duration) {
    if (h == nullptr || duration == nullptr || i < 0) return 0;
    if (iap2(h)) {
        int32_t n = 0;
        const char *const *list = iap2_tracks(h, result, &n);
        const bool ids_only = h->browser.track_info_ids_only != 0;
        const int64_t first = static_cast<int64_t>(i) * (ids_only ? 1 : 6);
        if (list == nullptr || first >= n) return 0;
        if (ids_only || first + 2 >= n) {
            *duration = 0;
        } else {
            *duration = static_cast<uint32_t>(strtoll(list[first + 2], nullptr, 0));
        }
        return 1;
    }
    const gval *records = iap1_tracks(h, result);
    int value = 0;
    if (records == nullptr || zal_ipod_get_result_db_track_info_duration(records, i, &value) != 1)
        return 0;
    *duration = static_cast<uint32_t>(value);
    return 1;
}

ZAL_API int zal_ipod_media_lib_get_track_name(zal_ipod_handle *h, const void *result, int i,
                                              char **text) {
    return text_field(h, result, i, 1, zal_ipod_get_result_db_track_info_name, text);
}
ZAL_API int zal_ipod_media_lib_get_track_artist(zal_ipod_handle *h, const void *result, int i,
                                                char **text) {
    return text_field(h, result, i, 3, zal_ipod_get_result_db_track_info_artist, text);
}
ZAL_API int zal_ipod_media_lib_get_track_album(zal_ipod_handle *h, const void *result, int i,
                                               char **text) {
    return text_field(h, result, i, 4, zal_ipod_get_result_db_track_info_album, text);
}
ZAL_API int zal_ipod_media_lib_get_track_genre(zal_ipod_handle *h, const void *result, int i,
                                               char **text) {
    return text_field(h, result, i, 5, zal_ipod_get_result_db_track_info_genre, text);
}

}  // extern "C"
