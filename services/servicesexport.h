#pragma once

/// Marks what the services offer to the library and to its callers. All else of an implementation
/// stays hidden in its shared object.
#define KELM_SERVICES_EXPORT __attribute__((visibility("default")))

/// Marks a function that services may leave out. Where nothing defines it, its address is null, and
/// the library does without. Define it in the same source as the functions that are required:
/// nothing else makes a linker take it from an archive.
#define KELM_SERVICES_OPTIONAL __attribute__((weak))
