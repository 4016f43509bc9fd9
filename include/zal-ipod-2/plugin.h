/**
 * @file
 * The two plug-in interfaces of the daemon, for the integrator who writes them and for the
 * daemon that calls them.
 *
 * USB host plug-in (-l): switches the head unit's USB port between host mode and device
 * mode. Media library plug-in (-m): keeps a device's media library in a local database.
 * Each plug-in is a shared library that defines some or all of the functions below under
 * exactly these names, with C linkage; the declarations carry ZAL_PLUGIN_EXPORT, so a
 * plug-in built with hidden visibility still exports them. Each entry point has a function
 * type (name_fn) that both its declaration and its slot in the tables use.
 *
 * The daemon resolves them by name at start-up (set_context_usb_host_plugin and
 * set_context_media_library_plugin in daemon.h) into the two tables at the end of this
 * header; a function the library does not define is a null pointer in its table, and the
 * daemon tests each pointer before it calls it.
 *
 * Conventions of the interfaces: an int result is 0 (or the count or flag stated) on
 * success and negative on failure. Texts are NUL-terminated UTF-8. A media library is
 * named by its media library identifier (mlid), the text the device gives it. Persistent
 * identifiers of tracks, playlists and collections are unsigned 64-bit numbers.
 */
#ifndef ZAL_IPOD_2_PLUGIN_H
#define ZAL_IPOD_2_PLUGIN_H

#include <stddef.h>
#include <stdint.h>

#include "serialize.h"
#include "zal_export.h"

#if defined(__GNUC__) || defined(__clang__)
/** Exports a plug-in's entry point even when the plug-in is built with hidden visibility. */
#define ZAL_PLUGIN_EXPORT __attribute__((visibility("default")))
#else
#define ZAL_PLUGIN_EXPORT
#endif

ZAL_BEGIN_DECLS

/* ---- USB host plug-in ------------------------------------------------------------------ */

/** Called once, right after the library is loaded. Negative: the port cannot be put in
 * host mode (the daemon reports it and carries on without host mode). */
typedef int ipod_platform_init_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_platform_init_fn ipod_platform_init;
/** 1 when the port supports USB host mode, 0 when it does not, negative on failure. */
typedef int ipod_is_host_mode_supported_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_is_host_mode_supported_fn ipod_is_host_mode_supported;
/** Switch the port to host mode; 0 once the switch is done, negative on failure. */
typedef int ipod_to_host_mode_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_to_host_mode_fn ipod_to_host_mode;
/** Switch the port back to device mode; 0 once done, negative on failure. */
typedef int ipod_to_device_mode_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_to_device_mode_fn ipod_to_device_mode;
/** 1 when a device is attached while the port is in host mode, 0 when none is. */
typedef int ipod_is_host_mode_connected_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_is_host_mode_connected_fn ipod_is_host_mode_connected;

/* ---- Media library plug-in ------------------------------------------------------------- */

/** Category numbers of the media library, as in the browser of the client API. */
enum {
    IPOD_MEDIA_CATEGORY_TOP = 0,
    IPOD_MEDIA_CATEGORY_PLAYLIST = 1,
    IPOD_MEDIA_CATEGORY_ARTIST = 2,
    IPOD_MEDIA_CATEGORY_ALBUM = 3,
    IPOD_MEDIA_CATEGORY_GENRE = 4,
    IPOD_MEDIA_CATEGORY_TRACK = 5,
    IPOD_MEDIA_CATEGORY_COMPOSER = 6,
    IPOD_MEDIA_CATEGORY_AUDIOBOOK = 7,
    IPOD_MEDIA_CATEGORY_PODCAST = 8,
    IPOD_MEDIA_CATEGORY_NESTED_PLAYLIST = 9,
    IPOD_MEDIA_CATEGORY_GENIUS_MIXES = 10,
    IPOD_MEDIA_CATEGORY_ITUNES_U = 11,
    IPOD_MEDIA_CATEGORY_COUNT = 12
};

/** One track as the device describes it in a library update. Texts may be null (unknown);
 * the plug-in copies what it keeps. */
typedef struct ipod_media_track {
    uint64_t persistent_id;   /**< the track's persistent identifier */
    const char *title;        /**< title */
    const char *artist;       /**< artist */
    const char *album;        /**< album title */
    const char *album_artist; /**< artist of the album */
    const char *genre;        /**< genre */
    const char *composer;     /**< composer */
    uint32_t duration_ms;     /**< length in milliseconds */
    uint16_t track_number;    /**< position on the album, from 1 */
    uint16_t track_count;     /**< tracks on the album */
    uint16_t disc_number;     /**< disc of the album, from 1 */
    uint16_t disc_count;      /**< discs of the album */
    int32_t media_type;       /**< the device's media type code (music, podcast, audiobook, ...) */
    int32_t rating;           /**< 0 to 100, -1 when unknown */
} ipod_media_track;

/** One playlist; parent_persistent_id is 0 at the top level. */
typedef struct ipod_media_playlist {
    uint64_t persistent_id;        /**< the playlist's persistent identifier */
    uint64_t parent_persistent_id; /**< the folder holding it, 0 at the top level */
    const char *name;              /**< its name */
    int32_t is_folder;             /**< 1 when it is a folder of playlists */
    int32_t is_genius_mix;         /**< 1 when it is a Genius mix */
} ipod_media_playlist;

/** Where the browser stands: for each category whose bit (1 << category) is set in
 * `selected`, the persistent identifier of the item chosen in it. */
typedef struct ipod_media_filter {
    uint32_t selected;                       /**< bit (1 << category) per chosen category */
    uint64_t ids[IPOD_MEDIA_CATEGORY_COUNT]; /**< chosen item per category, by category */
} ipod_media_filter;

/** Copies the last known revision of mlid (NUL-terminated, cut to size) into revision;
 * 1 when one is stored, 0 when the library has none yet, negative on failure. */
typedef int ipod_media_library_get_media_library_last_known_revision_fn(const char *mlid,
                                                                        char *revision,
                                                                        size_t size);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_get_media_library_last_known_revision_fn
    ipod_media_library_get_media_library_last_known_revision;
/** Creates the record of mlid unless it exists; 1 created, 0 existed, negative failure. */
typedef int ipod_media_library_insert_media_library_if_not_exists_fn(const char *mlid,
                                                                     const char *name);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_insert_media_library_if_not_exists_fn
    ipod_media_library_insert_media_library_if_not_exists;
/** Stores revision as the last known revision of mlid. */
typedef int ipod_media_library_update_media_library_last_known_revision_fn(const char *mlid,
                                                                           const char *revision);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_update_media_library_last_known_revision_fn
    ipod_media_library_update_media_library_last_known_revision;
/** Inserts or replaces by persistent identifier. */
typedef int ipod_media_library_insert_track_fn(const char *mlid, const ipod_media_track *track);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_insert_track_fn ipod_media_library_insert_track;
/** Inserts or replaces a playlist by persistent identifier. */
typedef int ipod_media_library_insert_playlist_fn(const char *mlid,
                                                  const ipod_media_playlist *playlist);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_insert_playlist_fn ipod_media_library_insert_playlist;
/** The track at position (0-based) of the playlist. */
typedef int ipod_media_library_insert_track_playlist_fn(const char *mlid, uint64_t playlist_id,
                                                        uint64_t track_id, uint32_t position);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_insert_track_playlist_fn
    ipod_media_library_insert_track_playlist;
/** Deletes the track with persistent identifier item_id. */
typedef int ipod_media_library_delete_media_item_fn(const char *mlid, uint64_t item_id);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_delete_media_item_fn ipod_media_library_delete_media_item;
/** Deletes the playlist with persistent identifier playlist_id. */
typedef int ipod_media_library_delete_media_playlist_fn(const char *mlid, uint64_t playlist_id);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_delete_media_playlist_fn
    ipod_media_library_delete_media_playlist;
/** Empties the playlist (its tracks stay in the library). */
typedef int ipod_media_library_delete_media_tracks_playlist_fn(const char *mlid,
                                                               uint64_t playlist_id);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_delete_media_tracks_playlist_fn
    ipod_media_library_delete_media_tracks_playlist;
/** Items of category under filter, from start, at most count (0: all): *items receives a
 * new array value of hashes ("id" as 8 bytes most significant first, "name" string) owned
 * by the caller. Returns the number of items, negative on failure (*items then null). */
typedef int ipod_media_library_get_items_current_category_fn(const char *mlid,
                                                             const ipod_media_filter *filter,
                                                             int32_t category, uint32_t start,
                                                             uint32_t count, gval **items);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_get_items_current_category_fn
    ipod_media_library_get_items_current_category;
/** Persistent identifier of the collection that filter selects; 0 on success. */
typedef int ipod_media_library_get_collection_id_fn(const char *mlid,
                                                    const ipod_media_filter *filter,
                                                    uint64_t *collection_id);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_get_collection_id_fn ipod_media_library_get_collection_id;
/** Tracks under filter like get_items_current_category, each hash holding the track's
 * fields ("id", "title", "artist", "album", "genre", "composer", "duration"). */
typedef int ipod_media_library_get_tracks_info_current_filter_fn(const char *mlid,
                                                                 const ipod_media_filter *filter,
                                                                 uint32_t start, uint32_t count,
                                                                 gval **tracks);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_get_tracks_info_current_filter_fn
    ipod_media_library_get_tracks_info_current_filter;
/** Forgets everything stored for mlid (the device reset its library). */
typedef int ipod_media_library_reset_database_for_mlid_fn(const char *mlid);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_reset_database_for_mlid_fn
    ipod_media_library_reset_database_for_mlid;
/** Brackets a library update; commit 0 at the end rolls it back. */
typedef int ipod_media_library_start_transaction_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_start_transaction_fn ipod_media_library_start_transaction;
/** Ends what start_transaction began: commit 1 keeps the update, 0 rolls it back. */
typedef int ipod_media_library_end_transaction_fn(int commit);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_end_transaction_fn ipod_media_library_end_transaction;
/** Opens the database at db_path (the context's media_library_db_path). */
typedef int ipod_media_library_init_fn(const char *db_path);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_init_fn ipod_media_library_init;
/** Closes the database; called once, before the daemon exits. */
typedef void ipod_media_library_finish_fn(void);
/** The entry point itself; its type above says what it does. */
ZAL_PLUGIN_EXPORT ipod_media_library_finish_fn ipod_media_library_finish;

/* ---- The resolved tables, held in the daemon's context --------------------------------- */

/** The USB host plug-in's entry points, in the order in which the loader resolves them;
 * each is the plug-in's function of the same name, or null when it defines none. */
typedef struct ipod_usb_host_entry_points {
    /** @{ */
    /** The plug-in's function of this name, or null. */
    ipod_platform_init_fn *ipod_platform_init;
    ipod_is_host_mode_supported_fn *ipod_is_host_mode_supported;
    ipod_to_host_mode_fn *ipod_to_host_mode;
    ipod_to_device_mode_fn *ipod_to_device_mode;
    ipod_is_host_mode_connected_fn *ipod_is_host_mode_connected;
    /** @} */
} ipod_usb_host_entry_points;

/** The media library plug-in's entry points: each is the plug-in's function
 * ipod_media_library_<field name>, or null when it defines none. */
typedef struct ipod_media_library_entry_points {
    /** @{ */
    /** The plug-in's ipod_media_library_ function of this name, or null. */
    ipod_media_library_get_media_library_last_known_revision_fn
        *get_media_library_last_known_revision;
    ipod_media_library_insert_media_library_if_not_exists_fn *insert_media_library_if_not_exists;
    ipod_media_library_update_media_library_last_known_revision_fn
        *update_media_library_last_known_revision;
    ipod_media_library_insert_track_fn *insert_track;
    ipod_media_library_insert_playlist_fn *insert_playlist;
    ipod_media_library_insert_track_playlist_fn *insert_track_playlist;
    ipod_media_library_delete_media_item_fn *delete_media_item;
    ipod_media_library_delete_media_playlist_fn *delete_media_playlist;
    ipod_media_library_delete_media_tracks_playlist_fn *delete_media_tracks_playlist;
    ipod_media_library_get_items_current_category_fn *get_items_current_category;
    ipod_media_library_get_collection_id_fn *get_collection_id;
    ipod_media_library_get_tracks_info_current_filter_fn *get_tracks_info_current_filter;
    ipod_media_library_reset_database_for_mlid_fn *reset_database_for_mlid;
    ipod_media_library_start_transaction_fn *start_transaction;
    ipod_media_library_end_transaction_fn *end_transaction;
    ipod_media_library_init_fn *init;
    ipod_media_library_finish_fn *finish;
    /** @} */
} ipod_media_library_entry_points;

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_PLUGIN_H */
