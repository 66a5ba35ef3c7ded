#pragma once

/**
 * Marks what the shared library `libssoclient` exports; everything else stays hidden. The libraries
 * are static all together or not at all.
 */
#ifdef QUILLON_STATIC
#define SSOCLIENT_API
#else
#define SSOCLIENT_API __attribute__((visibility("default")))
#endif
