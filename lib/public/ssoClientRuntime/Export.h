#pragma once

/**
 * Marks what the shared library `libssoclient_runtime` exports; everything else stays hidden. The
 * libraries are static all together or not at all.
 */
#ifdef QUILLON_STATIC
#define SSOCLIENT_RUNTIME_API
#else
#define SSOCLIENT_RUNTIME_API __attribute__((visibility("default")))
#endif
