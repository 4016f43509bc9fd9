// Accessory input and video-out controls: video-out mode and navigation, simple buttons,
// rotation input, VoiceOver, HID descriptors and reports, application launch and the head
// unit's power and state reports. Only the VoiceOver queries decode more than an integer.
#include "zal-ipod-2/command_forms.h"
#include "zal-ipod-2/device_decoders.h"

namespace {

// The frame values and indexes are 16-bit on the device side; larger numbers keep their
// low 16 bits.
uint16_t low16(const gval *hash, const char *key) {
    return static_cast<uint16_t>(zal_hash_int(hash, key, 0));
}

// Stores one item property. A name longer than the buffer is cut to 127 characters; a
// reply without a name text leaves an empty name (the item has none).
int32_t store_item(zal_ipod_handle *h, const gval *hash) {
    zal_voiceover_state &item = h->voiceover;
    const int32_t type = zal_hash_int(hash, "type", -1);
    if (type >= 0 && type < kVoiceOverNamedTypes) {
        item.current_index[type] = low16(hash, "current_index");
        item.last_index[type] = low16(hash, "last_index");
        zal_copy_text(item.name[type], kVoiceOverNameSize, zal_hash_string(hash, "name"));
        return 1;
    }
    if (type != kVoiceOverFrameType) return -1;
    item.topleft_x = low16(hash, "topleft_x");
    item.topleft_y = low16(hash, "topleft_y");
    item.bottomright_x = low16(hash, "bottomright_x");
    item.bottomright_y = low16(hash, "bottomright_y");
    return 1;
}

// Like the item reply: no flag (an "error" reply among them) is a failure.
int32_t decode_voiceover_parameter(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_flagged_int(h, reply, "get_voiceover_parameter", "value");
}

bool valid_named_type(zal_ipod_handle *h, int type) {
    return h != nullptr && type >= 0 && type < kVoiceOverNamedTypes;
}

}  // namespace

// The daemon sends the success flag in every VoiceOver reply: one without it (an "error"
// reply among them, whose text is kept as the handle's error text) counts as a failure.
int32_t zal_voiceover_item_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_flagged(h, reply, "get_current_voiceover_itemproperty", store_item);
}

extern "C" {

ZAL_COMMAND_NO_ARG(enter_videooutmode, ZAL_OP_ENTER_VIDEOOUTMODE)
ZAL_COMMAND_NO_ARG(exit_videooutmode, ZAL_OP_EXIT_VIDEOOUTMODE)
ZAL_COMMAND_NO_ARG(get_mode, ZAL_OP_GET_MODE)
ZAL_COMMAND_INT_ARG(set_videooutoptions, ZAL_OP_SET_VIDEOOUTOPTIONS)
ZAL_COMMAND_INT_ARG(navigate_videoout, ZAL_OP_NAVIGATE_VIDEOOUT)
ZAL_COMMAND_INT_ARG(set_statechange, ZAL_OP_SET_STATECHANGE)
ZAL_COMMAND_INT_ARG(simple_contextbutton, ZAL_OP_SIMPLE_CONTEXTBUTTON)
ZAL_COMMAND_INT_ARG(simple_videobutton, ZAL_OP_SIMPLE_VIDEOBUTTON)
ZAL_COMMAND_INT_ARG(simple_audiobutton, ZAL_OP_SIMPLE_AUDIOBUTTON)
ZAL_COMMAND_INT_ARG(simple_radiobutton, ZAL_OP_SIMPLE_RADIOBUTTON)
ZAL_COMMAND_INT_ARG(simple_camerabutton, ZAL_OP_SIMPLE_CAMERABUTTON)
ZAL_COMMAND_INT_ARG(set_video_delay, ZAL_OP_SET_VIDEO_DELAY)
ZAL_COMMAND_INT_ARG(set_available_current, ZAL_OP_SET_AVAILABLE_CURRENT)
ZAL_COMMAND_INT_ARG(set_internal_battery_charging_state, ZAL_OP_SET_INTERNAL_BATTERY_CHARGING_STATE)
ZAL_COMMAND_INT_ARG(set_voiceover_context, ZAL_OP_SET_VOICEOVER_CONTEXT)

ZAL_API int zal_ipod_get_videooutoptions(zal_ipod_handle *h, int flag) {
    return zal_cmd_send(h, ZAL_OP_GET_VIDEOOUTOPTIONS, zal_arg_bool(flag), __func__);
}
ZAL_API int zal_ipod_get_videooutoptions_sync(zal_ipod_handle *h, int flag) {
    return zal_cmd_sync_int(h, zal_ipod_get_videooutoptions(h, flag));
}

ZAL_API int zal_ipod_launchapplication(zal_ipod_handle *h, const char *application) {
    return zal_cmd_send(h, ZAL_OP_LAUNCHAPPLICATION, zal_arg_string(application), __func__);
}
ZAL_API int zal_ipod_launchapplication_sync(zal_ipod_handle *h, const char *application) {
    return zal_cmd_sync_int(h, zal_ipod_launchapplication(h, application));
}

ZAL_API int zal_ipod_rotation_input(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                    int32_t field2, uint8_t byte0, uint8_t byte1, uint8_t byte2,
                                    uint16_t word0, uint16_t word1) {
    return zal_cmd_send(h, ZAL_OP_ROTAION_IPNUT,
                        zal_arg_list(field0, field1, field2, byte0, byte1, byte2, word0, word1),
                        __func__);
}
ZAL_API int zal_ipod_rotation_input_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                         int32_t field2, uint8_t byte0, uint8_t byte1,
                                         uint8_t byte2, uint16_t word0, uint16_t word1) {
    return zal_cmd_sync_int(
        h, zal_ipod_rotation_input(h, field0, field1, field2, byte0, byte1, byte2, word0, word1));
}

ZAL_API int zal_ipod_voiceover_event(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                     int32_t field2, uint8_t byte0, uint8_t byte1, uint8_t byte2,
                                     const char *text) {
    return zal_cmd_send(h, ZAL_OP_VOICEOVER_EVENT,
                        zal_arg_list(field0, field1, field2, byte0, byte1, byte2, text), __func__);
}
ZAL_API int zal_ipod_voiceover_event_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                          int32_t field2, uint8_t byte0, uint8_t byte1,
                                          uint8_t byte2, const char *text) {
    return zal_cmd_sync_int(
        h, zal_ipod_voiceover_event(h, field0, field1, field2, byte0, byte1, byte2, text));
}

ZAL_API int zal_ipod_get_voiceover_parameter(zal_ipod_handle *h, int parameter) {
    return zal_cmd_send(h, ZAL_OP_GET_VOICEOVER_PARAMETER, zal_arg_int(parameter), __func__);
}
ZAL_API int zal_ipod_get_voiceover_parameter_sync(zal_ipod_handle *h, int parameter) {
    return zal_cmd_sync(h, zal_ipod_get_voiceover_parameter(h, parameter),
                        decode_voiceover_parameter);
}

ZAL_API int zal_ipod_set_voiceover_parameter(zal_ipod_handle *h, int parameter, int value) {
    return zal_cmd_send(h, ZAL_OP_SET_VOICEOVER_PARAMETER, zal_arg_ints({parameter, value}),
                        __func__);
}
ZAL_API int zal_ipod_set_voiceover_parameter_sync(zal_ipod_handle *h, int parameter, int value) {
    return zal_cmd_sync_int(h, zal_ipod_set_voiceover_parameter(h, parameter, value));
}

ZAL_API int zal_ipod_get_current_voiceover_itemproperty(zal_ipod_handle *h, int type) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_VOICEOVER_ITEMPROPERTY, zal_arg_int(type), __func__,
                        &zal_pending_slots::voiceover_item_tid);
}
ZAL_API int zal_ipod_get_current_voiceover_itemproperty_sync(zal_ipod_handle *h, int type) {
    return zal_cmd_sync(h, zal_ipod_get_current_voiceover_itemproperty(h, type),
                        zal_voiceover_item_decode);
}

ZAL_API int zal_ipod_register_descriptor(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                         int32_t field2, uint8_t byte0, uint8_t byte1) {
    return zal_cmd_send(h, ZAL_OP_REGISTER_DESCRIPTOR,
                        zal_arg_list(field0, field1, field2, byte0, byte1), __func__);
}
ZAL_API int zal_ipod_register_descriptor_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                              int32_t field2, uint8_t byte0, uint8_t byte1) {
    return zal_cmd_sync_int(h,
                            zal_ipod_register_descriptor(h, field0, field1, field2, byte0, byte1));
}

ZAL_API int zal_ipod_ipod_hid_report(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                     int32_t field2) {
    return zal_cmd_send(h, ZAL_OP_IPOD_HID_REPORT, zal_arg_ints({field0, field1, field2}),
                        __func__);
}
ZAL_API int zal_ipod_ipod_hid_report_sync(zal_ipod_handle *h, int32_t field0, int32_t field1,
                                          int32_t field2) {
    return zal_cmd_sync_int(h, zal_ipod_ipod_hid_report(h, field0, field1, field2));
}

// An array of one, not a bare integer: the daemon reads every HID request as an array.
ZAL_API int zal_ipod_unregister_descriptor(zal_ipod_handle *h, int32_t descriptor) {
    return zal_cmd_send(h, ZAL_OP_UNREGISTER_DESCRIPTOR, zal_arg_ints({descriptor}), __func__);
}
ZAL_API int zal_ipod_unregister_descriptor_sync(zal_ipod_handle *h, int32_t descriptor) {
    return zal_cmd_sync_int(h, zal_ipod_unregister_descriptor(h, descriptor));
}

ZAL_API int zal_ipod_voiceover_item_current_index(zal_ipod_handle *h, int type) {
    return valid_named_type(h, type) ? h->voiceover.current_index[type] : -1;
}
ZAL_API int zal_ipod_voiceover_item_last_index(zal_ipod_handle *h, int type) {
    return valid_named_type(h, type) ? h->voiceover.last_index[type] : -1;
}
ZAL_API const char *zal_ipod_voiceover_item_name(zal_ipod_handle *h, int type) {
    return valid_named_type(h, type) ? h->voiceover.name[type] : nullptr;
}
ZAL_API int zal_ipod_voiceover_item_topleft_x(zal_ipod_handle *h) {
    return h != nullptr ? h->voiceover.topleft_x : -1;
}
ZAL_API int zal_ipod_voiceover_item_topleft_y(zal_ipod_handle *h) {
    return h != nullptr ? h->voiceover.topleft_y : -1;
}
ZAL_API int zal_ipod_voiceover_item_bottomright_x(zal_ipod_handle *h) {
    return h != nullptr ? h->voiceover.bottomright_x : -1;
}
ZAL_API int zal_ipod_voiceover_item_bottomright_y(zal_ipod_handle *h) {
    return h != nullptr ? h->voiceover.bottomright_y : -1;
}

}  // extern "C"
