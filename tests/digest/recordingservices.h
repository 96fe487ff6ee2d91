#pragma once

#include <string>

/// Where the services write what they are told, a line each; null: nowhere.
struct Recording {
    static inline std::string* poTranscript = nullptr;
};
