/**
 * @file
 * Export and linkage macros shared by every public header of zal-ipod-2.
 */
#ifndef ZAL_IPOD_2_EXPORT_H
#define ZAL_IPOD_2_EXPORT_H

#if defined(__GNUC__) || defined(__clang__)
/** Marks a declaration as part of the library's exported API. Every name declared with it
 * is listed in cmake/libzal-ipod-2.map (scripts/update-exports keeps that list). */
#define ZAL_API __attribute__((visibility("default")))
/** Lets the compiler check a printf-style format: argument fmt is the format, args the
 * first of the values. */
#define ZAL_PRINTF(fmt, args) __attribute__((format(printf, fmt, args)))
#else
#define ZAL_API
#define ZAL_PRINTF(fmt, args)
#endif

#ifdef __cplusplus
#define ZAL_BEGIN_DECLS extern "C" {
#define ZAL_END_DECLS }
#else
/** Opens C linkage for the declarations that follow when compiled as C++. */
#define ZAL_BEGIN_DECLS
/** Closes what ZAL_BEGIN_DECLS opened. */
#define ZAL_END_DECLS
#endif

#endif /* ZAL_IPOD_2_EXPORT_H */
