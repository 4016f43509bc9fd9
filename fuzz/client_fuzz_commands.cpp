// The command table and the readers of the client fuzz harness.
#include "client_fuzz_commands.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <initializer_list>

namespace {

using Command = void (*)(zal_ipod_handle *h);

// Keeps results alive so that the calls are not optimised away.
volatile long sink;

void use(long v) {
    sink = sink + v;
}
void use(const void *p) {
    sink = sink + (p != nullptr ? 1 : 0);
}
void use_text(const char *s) {
    if (s != nullptr) sink = sink + static_cast<long>(strlen(s));
}

char config_value[ZAL_IPOD_CONFIG_VALUE_SIZE];

const Command kCommands[] = {
    [](zal_ipod_handle *h) { use(zal_ipod_open_session_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_close_session_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_config_sync(h, "socket_name", config_value)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_config_sync(h, "device", "usb")); },
    [](zal_ipod_handle *h) {
        zal_ipod_reply *r = zal_ipod_wait_for_tid(h, zal_ipod_hello(h));
        zal_ipod_reply_free(r);
    },
    [](zal_ipod_handle *h) { use(zal_ipod_keep_alive_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_play_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_playpause_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_stop_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_pause_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_next_track_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_prev_track_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_mute_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_inc_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_dec_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_device_audio_info_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_stop_device_audio_info_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_tracking_dec_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_tracking_inc_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_tracking_normal_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_ffw_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_rew_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_stop_ffwrew_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_voice_command_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_promote_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_demote_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_add_to_cart_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_start_bt_connection_updates_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_stop_bt_connection_updates_sync(h)); },
    // iAP1 database browsing.
    [](zal_ipod_handle *h) { use(zal_ipod_set_hierarchy_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_category_sync(h, 5)); },
    [](zal_ipod_handle *h) { use(zal_ipod_select_db_sync(h, 0, 5)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_records_sync(h, 0, 4)); },
    [](zal_ipod_handle *h) { use(zal_ipod_indexed_track_info_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_db_itunes_info_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_db_itunes_info_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_db_itunes_info_sync(h, 2)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_db_track_info_sync(h, 0, 4, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_pb_track_info_sync(h, 0, 4, 1)); },
    // Library updates and play lists.
    [](zal_ipod_handle *h) {
        char mlid[MAXIMUM_MLID_LENGTH];
        use(zal_ipod_get_media_library_unique_id_sync(h, mlid, sizeof mlid));
    },
    [](zal_ipod_handle *h) {
        const uint8_t list[2] = {1, 2};
        use(zal_ipod_set_update_items_sync(h, "aux", "lib", list, 2));
    },
    [](zal_ipod_handle *h) { use(zal_ipod_start_library_update_sync(h, "1")); },
    [](zal_ipod_handle *h) { use(zal_ipod_stop_library_update_sync(h, "lib")); },
    [](zal_ipod_handle *h) { use(zal_ipod_resume_library_update_sync(h, "lib", "1")); },
    [](zal_ipod_handle *h) {
        const uint64_t uids[2] = {1, 2};
        use(zal_play_items_sync(h, uids, 2, 0));
    },
    [](zal_ipod_handle *h) { use(zal_play_collection_sync(h, 1, 2, 0, "lib")); },
    [](zal_ipod_handle *h) {
        const uint8_t uid[8] = {0, 0, 0, 0, 0, 0, 0, 1};
        use(zal_ipod_prepare_uid_list_sync(h, 0, 0, 8, uid));
    },
    [](zal_ipod_handle *h) {
        const uint8_t uid[8] = {0, 0, 0, 0, 0, 0, 0, 1};
        use(zal_ipod_play_uid_list_sync(h, uid));
    },
    [](zal_ipod_handle *h) { use(zal_ipod_create_genius_playlist_sync(h, 0, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_refresh_genius_playlist_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_is_genius_availablefortrack_sync(h, 0, 0)); },
    [](zal_ipod_handle *h) {
        uint8_t data = 0;
        use(zal_ipod_get_playlist_info_sync(h, 0, 0, &data));
        use(data);
    },
    // Now playing.
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_info_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_sample_rate_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_is_audiobook_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_contains_video_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_play_state_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_device_current_draw_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_device_charge_if_power_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_current_track_index_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_shuffle_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_repeat_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_chapter_index_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_chapter_count_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_position_sync(h, 1000)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_track_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_current_playing_track_chapter_sync(h, 1)); },
    [](zal_ipod_handle *h) {
        use(zal_ipod_get_current_playing_track_chapter_play_status_sync(h, 0));
    },
    [](zal_ipod_handle *h) { use(zal_ipod_set_shuffle_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_repeat_sync(h, 2)); },
    [](zal_ipod_handle *h) { use(zal_ipod_write_tag_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_color_display_image_limits_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_preference_sync(h, 8)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_preference_sync(h, 8, 9)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_ipod_preference_sync(h, 3)); },
    [](zal_ipod_handle *h) { use(zal_ipod_set_ipod_preference_sync(h, 3, 1)); },
    [](zal_ipod_handle *h) {
        serialize_free(zal_ipod_health_examine(h, "fuzz", serialize_int(1)));
    },
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_artwork_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_current_track_pos_artwork_sync(h, 0, 1000)); },
    [](zal_ipod_handle *h) { use(zal_ipod_track_artwork_by_uid_sync(h, 0x0102030405060708ull)); },
    [](zal_ipod_handle *h) {
        int32_t *times = nullptr;
        int32_t count = 0;
        if (zal_ipod_current_track_artwork_times_sync(h, 0, &times, &count) == 1) {
            for (int32_t i = 0; i < count; ++i) use(times[i]);
            free(times);
        }
    },
    // Accessory input and video out.
    [](zal_ipod_handle *h) { use(zal_ipod_enter_videooutmode_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_videooutoptions_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_mode_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_launchapplication_sync(h, "app")); },
    [](zal_ipod_handle *h) { use(zal_ipod_simple_contextbutton_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_rotation_input_sync(h, 1, 2, 3, 4, 5, 6, 7, 8)); },
    [](zal_ipod_handle *h) { use(zal_ipod_voiceover_event_sync(h, 0, 0, 0, 0, 0, 0, "x")); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_voiceover_parameter_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_current_voiceover_itemproperty_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_current_voiceover_itemproperty_sync(h, 3)); },
    [](zal_ipod_handle *h) { use(zal_ipod_register_descriptor_sync(h, 1, 2, 3, 4, 5)); },
    [](zal_ipod_handle *h) { use(zal_ipod_unregister_descriptor_sync(h, 1)); },
    // Device information.
    [](zal_ipod_handle *h) { use(zal_ipod_request_lingo_version_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(static_cast<long>(zal_ipod_get_lingo_options_sync(h, 0))); },
    [](zal_ipod_handle *h) { use(zal_ipod_localization_info_sync(h, 0)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_current_eqprofile_index_sync(h)); },
    [](zal_ipod_handle *h) { use(zal_ipod_get_num_eqprofiles_sync(h)); },
    [](zal_ipod_handle *h) {
        char name[ZAL_EQPROFILE_NAME_SIZE];
        if (zal_ipod_get_indexed_eqprofile_name_sync(h, 0, name) == 1)
            use(static_cast<long>(strnlen(name, sizeof name)));
    },
    [](zal_ipod_handle *h) {
        int state = 0, level = 0;
        use(zal_ipod_get_power_battery_state_sync(h, &state, &level) + state + level);
    },
    [](zal_ipod_handle *h) { use(zal_ipod_get_sound_check_state_sync(h)); },
    [](zal_ipod_handle *h) {
        char *status = zal_ipod_bt_connection_status_sync(h);
        use_text(status);
        free(status);
    },
    [](zal_ipod_handle *h) { use(zal_ipod_device_power_source_update_sync(h, 1, 2)); },
    // Communications and vehicle integration.
    [](zal_ipod_handle *h) { use(zal_ipod_start_telephony_callstate_information_sync(h, 1)); },
    [](zal_ipod_handle *h) { use(zal_ipod_send_eap_datagram_sync(h, 1, "abc", 3)); },
    [](zal_ipod_handle *h) { use(zal_ipod_send_vehicle_status_update_sync(h, 1, 2, 3, -4, 5)); },
    [](zal_ipod_handle *h) {
        use(zal_ipod_send_accessory_wifi_configuration_information(h, "ap", "pw", 1, 2));
    },
};

// Every field of every track of a track info result, and one past the end.
void read_track_info(const gval *r) {
    const int count = zal_ipod_get_result_db_track_info_count(r);
    for (int i = -1; i <= count; ++i) {
        int number = 0;
        const char *text = nullptr;
        const uint8_t *uid = nullptr;
        if (zal_ipod_get_result_db_track_info_capability(r, i, &number)) use(number);
        if (zal_ipod_get_result_db_track_info_name(r, i, &text)) use_text(text);
        if (zal_ipod_get_result_db_track_info_artist(r, i, &text)) use_text(text);
        if (zal_ipod_get_result_db_track_info_album(r, i, &text)) use_text(text);
        if (zal_ipod_get_result_db_track_info_genre(r, i, &text)) use_text(text);
        if (zal_ipod_get_result_db_track_info_composer(r, i, &text)) use_text(text);
        if (zal_ipod_get_result_db_track_info_duration(r, i, &number)) use(number);
        if (zal_ipod_get_result_db_track_info_uid(r, i, &uid)) use(uid[7]);
    }
}

}  // namespace

unsigned zal_fuzz_command_count() {
    return sizeof kCommands / sizeof kCommands[0];
}

void zal_fuzz_run_command(zal_ipod_handle *h, unsigned selector) {
    kCommands[selector % (sizeof kCommands / sizeof kCommands[0])](h);
}

void zal_fuzz_read_event(const zal_ipod_event *e) {
    uint32_t length = 0;
    const void *bytes = zal_ipod_event_eap_datagram_data(e, &length);
    if (bytes != nullptr && length > 0) use(static_cast<const unsigned char *>(bytes)[length - 1]);
    const char *text = nullptr;
    if (zal_ipod_event_wifi_information_ssid(e, &text) > 0) use_text(text);
    if (zal_ipod_event_wifi_information_passphrase(e, &text) > 0) use_text(text);
    use(zal_ipod_event_type(e));
    use_text(zal_ipod_event_get_serial(e));
    use_text(zal_ipod_event_connected_serial(e));
    use_text(zal_ipod_event_disconnected_serial(e));
    use(zal_ipod_event_authenticated(e));
    use(zal_ipod_event_mode_changed(e));
    use(zal_ipod_event_time_position(e));
    use(zal_ipod_event_get_media_lib_update_progress(e));
    use_text(zal_ipod_event_bluetooth_status(e));
    use_text(zal_ipod_event_get_playing_app(e));
    use(zal_ipod_event_shuffle_status(e));
    use(zal_ipod_event_role_switched(e));
    use(zal_ipod_event_eap_datagram_session_id(e));
    use(zal_ipod_event_eap_datagram_protocol_index(e));
    use(zal_ipod_event_location_information_state(e));
    use(zal_ipod_event_location_supported_NMEA(e));
    use_text(zal_ipod_event_telephony_callstate_remote_id(e));
    use_text(zal_ipod_event_telephony_callstate_display_name(e));
    use(zal_ipod_event_telephony_callstate_status(e));
    use(zal_ipod_event_telephony_callstate_direction(e));
    use_text(zal_ipod_event_telephony_callstate_call_uuid(e));
    use_text(zal_ipod_event_telephony_callstate_address_book_id(e));
    use_text(zal_ipod_event_telephony_callstate_label(e));
    use(zal_ipod_event_telephony_callstate_service(e));
    use(zal_ipod_event_telephony_callstate_is_conferenced(e));
    use(zal_ipod_event_telephony_callstate_conference_group(e));
    use(zal_ipod_event_telephony_callstate_disconnect_reason(e));
    use(zal_ipod_event_vehicle_status_update_is_started(e));
    use(zal_ipod_event_vehicle_status_update_night_mode(e));
    use(zal_ipod_event_vehicle_status_update_range(e));
    use(zal_ipod_event_vehicle_status_update_outside_temperature(e));
    use(zal_ipod_event_vehicle_status_update_inside_temperature(e));
    use(zal_ipod_event_vehicle_status_update_range_warning(e));
    use(zal_ipod_event_wifi_information_status(e));
    use(zal_ipod_event_wifi_information_type(e));
    use(zal_ipod_event_telephony_update_strength(e));
    use(zal_ipod_event_telephony_update_registration_status(e));
    use(zal_ipod_event_telephony_update_airplane_mode(e));
    use_text(zal_ipod_event_telephony_update_carrier_name(e));
    use(zal_ipod_event_telephony_update_cellular_supported(e));
    use(zal_ipod_event_telephony_update_telephony_enabled(e));
    use(zal_ipod_event_telephony_update_facetime_audio_enabled(e));
    use(zal_ipod_event_telephony_update_facetime_video_enabled(e));
    use(zal_ipod_event_telephony_update_mute_status(e));
    use(zal_ipod_event_telephony_update_current_call_count(e));
    use(zal_ipod_event_telephony_update_new_voicemail_count(e));
    use(zal_ipod_event_telephony_update_initiate_call_available(e));
    use(zal_ipod_event_telephony_update_end_and_accept_available(e));
    use(zal_ipod_event_telephony_update_hold_and_accept_available(e));
    use(zal_ipod_event_telephony_update_swap_available(e));
    use(zal_ipod_event_telephony_update_merge_available(e));
    use(zal_ipod_event_telephony_update_hold_available(e));
    use(zal_ipod_event_wireless_carplay_update_status(e));
}

void zal_fuzz_read_handle(zal_ipod_handle *h) {
    const int count = zal_ipod_device_count(h);
    for (int i = -1; i <= count; ++i) {
        use_text(zal_ipod_device_serial(h, i));
        use(zal_ipod_device_transport_mode(h, i));
        use(zal_ipod_device_usb_bus(h, i));
        use(zal_ipod_device_usb_address(h, i));
        use(zal_ipod_device_rfcomm_id(h, i));
        use(zal_ipod_device_used(h, i));
        use(zal_ipod_device_authenticated(h, i));
        use(zal_ipod_device_is_extended(h, i));
        use(zal_ipod_device_protocol(h, i));
    }
    use_text(zal_ipod_device_name(h));
    use_text(zal_ipod_get_error_message(h));
    use(zal_ipod_current_session(h));
    use(zal_ipod_is_session_opened(h));
    use(zal_ipod_is_ready(h));
    use(zal_ipod_get_category(h));
    const int records = zal_ipod_record_count(h);
    for (int i = -1; i <= (records < 64 ? records : 64); ++i) use_text(zal_ipod_record(h, i));
    read_track_info(zal_ipod_get_result_db_track_info(h));
    read_track_info(zal_ipod_get_result_pb_track_info(h));
    use(zal_ipod_get_result_db_device_uid(h)[7]);
    use(zal_ipod_get_result_db_last_sync_time(h)[6]);
    use(zal_ipod_get_result_db_itunes_info_count(h));
    use_text(zal_ipod_current_track_title(h));
    use_text(zal_ipod_current_track_chapter(h));
    use_text(zal_ipod_current_track_artist(h));
    use_text(zal_ipod_current_track_album(h));
    use_text(zal_ipod_current_track_artwork_name(h));
    use_text(zal_ipod_last_known_librevision(h));
    use_text(zal_ipod_playing_app(h));
    for (int (*get)(zal_ipod_handle *) : {zal_ipod_current_track_length,
                                          zal_ipod_current_track_position,
                                          zal_ipod_current_track_state,
                                          zal_ipod_init_state,
                                          zal_ipod_current_number_of_tracks,
                                          zal_ipod_current_track_index,
                                          zal_ipod_current_chapter_index,
                                          zal_ipod_current_chapter_count,
                                          zal_ipod_current_chapter_length,
                                          zal_ipod_current_chapter_position,
                                          zal_ipod_current_sample_rate,
                                          zal_ipod_current_track_timestamp,
                                          zal_ipod_current_track_timestamp_usec,
                                          zal_ipod_current_track_has_artwork,
                                          zal_ipod_current_track_has_chapters,
                                          zal_ipod_current_shuffle_state,
                                          zal_ipod_current_repeat_state,
                                          zal_ipod_get_color_display_image_limits_maxImageWidth,
                                          zal_ipod_get_color_display_image_limits_maxImageHeigh,
                                          zal_ipod_get_color_display_image_limits_pixelFormat})
        use(get(h));
    // Every byte the artwork record says it holds is read.
    const unsigned char *pixels = zal_ipod_current_track_artwork_data(h);
    const uint32_t length = zal_ipod_current_track_artwork_length(h);
    long sum = 0;
    for (uint32_t i = 0; pixels != nullptr && i < length; ++i) sum += pixels[i];
    use(sum);
    use(zal_ipod_current_track_artwork_width(h) + zal_ipod_current_track_artwork_height(h) +
        zal_ipod_current_track_artwork_rowstride(h) +
        zal_ipod_current_track_artwork_pixel_format(h));
    for (int type = -1; type <= 3; ++type) {
        use(zal_ipod_voiceover_item_current_index(h, type));
        use(zal_ipod_voiceover_item_last_index(h, type));
        use_text(zal_ipod_voiceover_item_name(h, type));
        use_text(zal_ipod_current_localization_info(h, type));
    }
    use(zal_ipod_voiceover_item_topleft_x(h) + zal_ipod_voiceover_item_topleft_y(h) +
        zal_ipod_voiceover_item_bottomright_x(h) + zal_ipod_voiceover_item_bottomright_y(h));
    use(zal_ipod_get_result_lingo_version_major(h) + zal_ipod_get_result_lingo_version_minor(h));
    use_text(zal_ipod_get_result_lingo_version(h));
}
