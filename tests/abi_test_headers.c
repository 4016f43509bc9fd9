/* Every public header compiled as C, and a few calls made from C. */
#include <stdlib.h>
#include <string.h>

#include "zal-ipod-2/common.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/serialize.h"
#include "zal-ipod-2/zal_export.h"
#if __has_include("zal-ipod-2/zal-ipod-2.h")
#include "zal-ipod-2/zal-ipod-2.h"
#endif

int abi_c_round_trip(void);
const char *abi_c_opcode_name(void);

/* Builds a hash from C, encodes and decodes it; 1 when the copy reads back the same. */
int abi_c_round_trip(void) {
    gval *h = serialize_hash();
    serialize_hash_add(h, "serial", serialize_string("ab12"));
    serialize_hash_add(h, "authenticated", serialize_int(1));
    uint32_t len = 0;
    unsigned char *buf = serialize(h, &len);
    gval *back = unserialize(buf, len);
    int ok = len == 47 && serialize_type(back) == SERIALIZE_HASH &&
             strcmp(serialize_get_string(serialize_hash_get(back, "serial")), "ab12") == 0 &&
             serialize_get_int(serialize_hash_get(back, "authenticated")) == 1;
    free(buf);
    serialize_free(back);
    serialize_free(h);
    return ok;
}

const char *abi_c_opcode_name(void) {
    return get_function_string(ZAL_OP_KEEP_ALIVE);
}
