/*
 * now_playing: connects to the daemon, lists the attached devices, opens a session on the
 * first one, starts playback and prints the first events that follow.
 *
 *     now_playing [reconnect-address]
 *
 * The first connection goes to the daemon's local socket. The address (argv[1], else the
 * environment variable ZALIPODDAEMON) names where to connect again if that connection is
 * lost: "host:port" or a socket file.
 */
#include <stdio.h>
#include <zal-ipod-2/zal-ipod-2.h>

static int on_event(zal_ipod_handle *h, zal_ipod_event *event, void *user) {
    int *seen = (int *)user;
    (void)h;
    printf("event %d from %s", zal_ipod_event_type(event), zal_ipod_event_get_serial(event));
    if (zal_ipod_event_type(event) == ZALIPOD_EVENT_TRACK_POSITION_CHANGED)
        printf(": position %d ms", zal_ipod_event_time_position(event));
    printf("\n");
    ++*seen;
    return 0;
}

int main(int argc, char **argv) {
    zal_ipod_handle *h = zal_ipod_connect(argc > 1 ? argv[1] : NULL);
    if (h == NULL) {
        fprintf(stderr, "cannot reach the daemon\n");
        return 1;
    }
    int count = zal_ipod_device_count(h);
    for (int i = 0; i < count; i++) printf("device %d: %s\n", i, zal_ipod_device_serial(h, i));

    int seen = 0;
    zal_ipod_set_event_cb(h, on_event, &seen);
    if (count == 0 || zal_ipod_open_session_sync(h, 0) != 1 || zal_ipod_play_sync(h) < 0) {
        fprintf(stderr, "cannot play on device 0\n");
        zal_ipod_close(h);
        return 1;
    }
    /* Each read pass waits at most half a second and delivers what arrived. */
    for (int pass = 0; pass < 20 && seen < 4; pass++) zal_ipod_read(h);

    zal_ipod_close(h);
    return seen >= 4 ? 0 : 1;
}
