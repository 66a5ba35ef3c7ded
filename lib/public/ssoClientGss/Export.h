#pragma once

/** Marks what the shared library `libssoclient_gss` exports; everything else stays hidden. */
#define SSOCLIENT_GSS_API __attribute__((visibility("default")))
