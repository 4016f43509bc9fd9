// Diagnostic dumps of values (into the Android log or on stdout) and of raw bytes.
#include <cstdio>

#include "common/log.h"
#include "common/value_internal.h"

namespace {

// The log has no partial lines: every piece of the dump, indentation steps included,
// is a record of its own.
void log_piece(const char *text) {
    __android_log_write(ANDROID_LOG_DEBUG, ZAL_LOG_TAG, text);
}

void log_indent(int depth) {
    for (int i = 0; i < depth; ++i) log_piece("  ");
}

void print_indent(int depth) {
    for (int i = 0; i < depth; ++i) fputs("  ", stdout);
}

void print_bytes_escaped(const unsigned char *p, uint32_t n) {
    for (uint32_t i = 0; i < n; ++i) {
        if (p[i] >= 33 && p[i] <= 126)
            putchar(p[i]);
        else
            printf("\\x%02x", p[i]);
    }
    putchar('\n');
}

void print_depth2(const gval *v, int depth) {
    if (v != nullptr && v->type == SERIALIZE_ARRAY) {
        int count = serialize_array_count(v);
        for (int i = 0; i < count; ++i)
            print_depth2(serialize_array_get(v, static_cast<uint32_t>(i)), depth + 1);
        return;
    }
    print_indent(depth);
    switch (serialize_type(v)) {
        case SERIALIZE_INT:
            printf("%d\n", serialize_get_int(v));
            break;
        case SERIALIZE_FLOAT:
            printf("%f\n", static_cast<double>(serialize_get_float(v)));
            break;
        case SERIALIZE_STRING:
            puts(serialize_get_string(v));
            break;
        case SERIALIZE_BYTES: {
            uint32_t n = 0;
            const void *p = serialize_get_bytes(v, &n);
            print_bytes_escaped(static_cast<const unsigned char *>(p), n);
            break;
        }
        case SERIALIZE_HASH: {
            puts("{");
            const gval_hash *body = value_hash_body(v);
            for (int32_t i = 0; i < body->count; ++i) {
                print_indent(depth + 1);
                printf("\"%s\"=>", body->keys[i]);
                print_depth2(body->values[i], depth + 1);
            }
            print_indent(depth);
            puts("}");
            break;
        }
        default:
            puts("unknown type");
            break;
    }
}

}  // namespace

extern "C" {

ZAL_API void serialize_print(const gval *v) {
    serialize_print_depth(v, 0);
}

ZAL_API void serialize_print_depth(const gval *v, int depth) {
    if (v != nullptr && v->type == SERIALIZE_ARRAY) {
        int count = serialize_array_count(v);
        for (int i = 0; i < count; ++i)
            serialize_print_depth(serialize_array_get(v, static_cast<uint32_t>(i)), depth + 1);
        return;
    }
    log_indent(depth);
    switch (serialize_type(v)) {
        case SERIALIZE_INT:
            ZAL_LOGD("%d\n", serialize_get_int(v));
            break;
        case SERIALIZE_FLOAT:
            ZAL_LOGD("%f\n", static_cast<double>(serialize_get_float(v)));
            break;
        case SERIALIZE_STRING:
            ZAL_LOGD("%s\n", serialize_get_string(v));
            break;
        case SERIALIZE_BYTES:
            ZAL_LOGD("binary data lenght: %d\n", static_cast<int>(v->len));
            log_piece("\n");
            break;
        case SERIALIZE_HASH: {
            log_piece("{\n");
            const gval_hash *body = value_hash_body(v);
            for (int32_t i = 0; i < body->count; ++i) {
                log_indent(depth + 1);
                ZAL_LOGD("\"%s\"=>", body->keys[i]);
                serialize_print_depth(body->values[i], depth + 1);
            }
            log_indent(depth);
            log_piece("}\n");
            break;
        }
        default:
            log_piece("unknown type\n");
            break;
    }
}

ZAL_API void serialize_print_depth2(const gval *v, int depth) {
    print_depth2(v, depth);
    fflush(stdout);
}

ZAL_API void print_hex(const unsigned char *buf, int count) {
    printf("\n%s, count=%d\n", "print_hex", count);
    for (int i = 0; i < count; ++i) printf("%02X", buf[i]);
    putchar('\n');
    fflush(stdout);
}

}  // extern "C"
