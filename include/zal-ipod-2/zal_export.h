/* Export and linkage macros shared by every public header of zal-ipod-2. */
#ifndef ZAL_IPOD_2_EXPORT_H
#define ZAL_IPOD_2_EXPORT_H

#if defined(__GNUC__) || defined(__clang__)
#define ZAL_API __attribute__((visibility("default")))
#define ZAL_PRINTF(fmt, args) __attribute__((format(printf, fmt, args)))
#else
#define ZAL_API
#define ZAL_PRINTF(fmt, args)
#endif

#ifdef __cplusplus
#define ZAL_BEGIN_DECLS extern "C" {
#define ZAL_END_DECLS }
#else
#define ZAL_BEGIN_DECLS
#define ZAL_END_DECLS
#endif

#endif /* ZAL_IPOD_2_EXPORT_H */
