/* Export and linkage macros shared by every public header of the library. */
#ifndef KVI_EXPORT_H
#define KVI_EXPORT_H

#if defined(__GNUC__)
#define KVI_EXPORT __attribute__((visibility("default")))
#else
#define KVI_EXPORT
#endif

#ifdef __cplusplus
#define KVI_EXTERN_C_BEGIN extern "C" {
#define KVI_EXTERN_C_END }
#else
#define KVI_EXTERN_C_BEGIN
#define KVI_EXTERN_C_END
#endif

/* SaHpi.h defines the same, so that it stands alone. */
#ifndef KVI_NOEXCEPT
#ifdef __cplusplus
#define KVI_NOEXCEPT noexcept
#else
#define KVI_NOEXCEPT
#endif
#endif

/* Exported functions are declared with KVI_API so C sees a plain prototype and
 * C++ sees a noexcept one: no exception may cross into a C caller. */
#define KVI_API KVI_EXPORT

#endif
