#pragma once
// Symbol visibility for the host framework library (libVorantHost) and the
// device plug-in. Everything is hidden by default; these macros mark what
// crosses a library boundary.

#if defined(_WIN32)
#  define VORANT_EXPORT __declspec(dllexport)
#  define VORANT_IMPORT __declspec(dllimport)
#else
#  define VORANT_EXPORT __attribute__((visibility("default")))
#  define VORANT_IMPORT __attribute__((visibility("default")))
#endif

#if defined(VORANT_HOST_BUILDING)
#  define VORANT_HOST_API VORANT_EXPORT
#else
#  define VORANT_HOST_API VORANT_IMPORT
#endif

#if defined(__GNUC__)
#  define VORANT_PRINTF(fmtIndex, firstArg) __attribute__((format(printf, fmtIndex, firstArg)))
#else
#  define VORANT_PRINTF(fmtIndex, firstArg)
#endif
