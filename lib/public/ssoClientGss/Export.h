#pragma once

/**
 * Marks what the shared library `libssoclient_gss` exports; everything else stays hidden. The
 * libraries are static all together or not at all.
 */
#ifdef QUILLON_STATIC
#define SSOCLIENT_GSS_API
#else
#define SSOCLIENT_GSS_API __attribute__((visibility("default")))
#endif
