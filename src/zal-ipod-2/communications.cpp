// Communications and vehicle integration: telephony reports, EAP datagrams, location and
// vehicle status answers, the Bluetooth component state and the Wi-Fi access point. The
// device's side of these conversations arrives as events; the commands send positional
// values only and their _sync forms follow the integer reply rule.
#include "common/log.h"
#include "zal-ipod-2/command_forms.h"

extern "C" {

ZAL_COMMAND_INT_ARG(start_telephony_callstate_information,
                    ZAL_OP_START_TELEPHONY_CALLSTATE_INFORMATION)
ZAL_COMMAND_NO_ARG(stop_telephony_callstate_information,
                   ZAL_OP_STOP_TELEPHONY_CALLSTATE_INFORMATION)
ZAL_COMMAND_NO_ARG(start_telephony_update, ZAL_OP_START_TELEPHONY_UPDATE)
ZAL_COMMAND_NO_ARG(stop_telephony_update, ZAL_OP_STOP_TELEPHONY_UPDATE)
ZAL_COMMAND_INT_ARG(send_bluetooth_component_information, ZAL_OP_SET_BT_COMPONENT_STATE)

// The datagram's tid goes to the identifier-list slot, which the dispatcher reports as 1.
ZAL_API int zal_ipod_send_eap_datagram(zal_ipod_handle *h, int session_id, const void *data,
                                       int length) {
    return zal_cmd_send(h, ZAL_OP_SEND_EAP_DATAGRAM,
                        zal_arg_list(session_id, length, zal_arg_byte_string(data, length)),
                        __func__, &zal_pending_slots::uid_list_tid);
}
ZAL_API int zal_ipod_send_eap_datagram_sync(zal_ipod_handle *h, int session_id, const void *data,
                                            int length) {
    return zal_cmd_sync_int(h, zal_ipod_send_eap_datagram(h, session_id, data, length));
}

ZAL_API int zal_ipod_send_location_information(zal_ipod_handle *h, const char *text) {
    return zal_cmd_send(h, ZAL_OP_SEND_LOCATION_INFO, zal_arg_string(text), __func__);
}
ZAL_API int zal_ipod_send_location_information_sync(zal_ipod_handle *h, const char *text) {
    return zal_cmd_sync_int(h, zal_ipod_send_location_information(h, text));
}

ZAL_API int zal_ipod_send_vehicle_status_update(zal_ipod_handle *h, int a, int b, int c, int16_t d,
                                                uint8_t e) {
    return zal_cmd_send(h, ZAL_OP_SEND_VEHICLE_STATUS_UPDATE, zal_arg_list(a, b, c, d, e),
                        __func__);
}
ZAL_API int zal_ipod_send_vehicle_status_update_sync(zal_ipod_handle *h, int a, int b, int c,
                                                     int16_t d, uint8_t e) {
    return zal_cmd_sync_int(h, zal_ipod_send_vehicle_status_update(h, a, b, c, d, e));
}

// Sent whether or not a session is open: the access point is configured before any device
// is in use.
ZAL_API int zal_ipod_send_accessory_wifi_configuration_information(zal_ipod_handle *h,
                                                                   const char *ssid,
                                                                   const char *passphrase,
                                                                   uint16_t first_value,
                                                                   uint16_t second_value) {
    ZAL_TRACE();
    return zal_cmd_send(h, ZAL_OP_SEND_ACCESSORY_WIFI_CONFIGURATION,
                        zal_arg_list(ssid, passphrase, first_value, second_value), __func__,
                        nullptr, false);
}

}  // extern "C"
