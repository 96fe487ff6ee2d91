#pragma once

/// Marks what the services offer to the library and to its callers. All else of an implementation
/// stays hidden in its shared object.
#define KELM_SERVICES_EXPORT __attribute__((visibility("default")))
