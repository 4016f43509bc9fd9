/* A program built against an installed zal-ipod-2, the way an application is: only the
 * installed headers and library. It checks that the version it was built for is the one it
 * runs with, that the value encoding works through the exported API, and that connecting
 * without a daemon fails cleanly. Exit status 0 when all holds. */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <zal-ipod-2/zal-ipod-2.h>

#ifndef EXPECTED_VERSION
#error "build with -DEXPECTED_VERSION=\"<major>.<minor>.<patch>\" (the installed version)"
#endif

static int failures;

static void check(int ok, const char *what) {
    if (!ok) {
        fprintf(stderr, "consumer: FAILED: %s\n", what);
        failures++;
    }
}

int main(void) {
    int l0 = -1, l1 = -1, l2 = -1;
    char version[64];
    getReleaseVersion(&l0, &l1, &l2);
    snprintf(version, sizeof version, "%d.%d.%d", l0, l1, l2);
    check(strcmp(version, EXPECTED_VERSION) == 0, "getReleaseVersion is the installed version");
    check(l0 == getVersionLevel0() && l1 == getVersionLevel1() && l2 == getVersionLevel2(),
          "getVersionLevel0..2 agree with getReleaseVersion");

    /* A hash through the wire encoding and back. */
    gval *hash = serialize_hash();
    check(hash != NULL, "serialize_hash");
    if (hash != NULL) {
        serialize_hash_add(hash, "serial", serialize_string("A1B2"));
        serialize_hash_add(hash, "volume", serialize_int(-7));
        uint32_t len = 0;
        unsigned char *wire = serialize(hash, &len);
        gval *back = wire != NULL ? unserialize(wire, len) : NULL;
        check(back != NULL && serialize_type(back) == SERIALIZE_HASH, "unserialize gives a hash");
        if (back != NULL) {
            const char *serial = serialize_get_string(serialize_hash_get(back, "serial"));
            check(serial != NULL && strcmp(serial, "A1B2") == 0, "string survives the round trip");
            check(serialize_get_int(serialize_hash_get(back, "volume")) == -7,
                  "integer survives the round trip");
            serialize_free(back);
        }
        free(wire);
        serialize_free(hash);
    }
    check(strcmp(get_function_string(ZAL_OP_GET_CONFIG), "GET_CONFIG") == 0,
          "opcode names come from the library");

    /* No daemon listens here: the connection is refused and no handle is made. */
    zal_ipod_handle *h = zal_ipod_connect(NULL);
    check(h == NULL, "zal_ipod_connect without a daemon returns NULL");
    if (h != NULL) zal_ipod_close(h);

    if (failures == 0) printf("consumer: zal-ipod-2 %s works\n", version);
    return failures == 0 ? 0 : 1;
}
