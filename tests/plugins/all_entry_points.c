/* A plug-in that defines all 22 entry points, built against the declarations of plugin.h,
 * and counts the calls of its initialisation. */
#include "zal-ipod-2/plugin.h"

ZAL_PLUGIN_EXPORT int test_platform_init_calls;

int ipod_platform_init(void) {
    ++test_platform_init_calls;
    return 0;
}
int ipod_is_host_mode_supported(void) {
    return 1;
}
int ipod_to_host_mode(void) {
    return 0;
}
int ipod_to_device_mode(void) {
    return 0;
}
int ipod_is_host_mode_connected(void) {
    return 0;
}

int ipod_media_library_get_media_library_last_known_revision(const char *mlid, char *revision,
                                                             size_t size) {
    (void)mlid;
    if (size > 0) revision[0] = '\0';
    return 0;
}
int ipod_media_library_insert_media_library_if_not_exists(const char *mlid, const char *name) {
    (void)mlid, (void)name;
    return 1;
}
int ipod_media_library_update_media_library_last_known_revision(const char *mlid,
                                                                const char *revision) {
    (void)mlid, (void)revision;
    return 0;
}
int ipod_media_library_insert_track(const char *mlid, const ipod_media_track *track) {
    (void)mlid, (void)track;
    return 0;
}
int ipod_media_library_insert_playlist(const char *mlid, const ipod_media_playlist *playlist) {
    (void)mlid, (void)playlist;
    return 0;
}
int ipod_media_library_insert_track_playlist(const char *mlid, uint64_t playlist_id,
                                             uint64_t track_id, uint32_t position) {
    (void)mlid, (void)playlist_id, (void)track_id, (void)position;
    return 0;
}
int ipod_media_library_delete_media_item(const char *mlid, uint64_t item_id) {
    (void)mlid, (void)item_id;
    return 0;
}
int ipod_media_library_delete_media_playlist(const char *mlid, uint64_t playlist_id) {
    (void)mlid, (void)playlist_id;
    return 0;
}
int ipod_media_library_delete_media_tracks_playlist(const char *mlid, uint64_t playlist_id) {
    (void)mlid, (void)playlist_id;
    return 0;
}
int ipod_media_library_get_items_current_category(const char *mlid, const ipod_media_filter *filter,
                                                  int32_t category, uint32_t start, uint32_t count,
                                                  gval **items) {
    (void)mlid, (void)filter, (void)category, (void)start, (void)count;
    *items = 0;
    return 0;
}
int ipod_media_library_get_collection_id(const char *mlid, const ipod_media_filter *filter,
                                         uint64_t *collection_id) {
    (void)mlid, (void)filter;
    *collection_id = 0;
    return 0;
}
int ipod_media_library_get_tracks_info_current_filter(const char *mlid,
                                                      const ipod_media_filter *filter,
                                                      uint32_t start, uint32_t count,
                                                      gval **tracks) {
    (void)mlid, (void)filter, (void)start, (void)count;
    *tracks = 0;
    return 0;
}
int ipod_media_library_reset_database_for_mlid(const char *mlid) {
    (void)mlid;
    return 0;
}
int ipod_media_library_start_transaction(void) {
    return 0;
}
int ipod_media_library_end_transaction(int commit) {
    (void)commit;
    return 0;
}
int ipod_media_library_init(const char *db_path) {
    (void)db_path;
    return 0;
}
void ipod_media_library_finish(void) {}
