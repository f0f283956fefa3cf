// The plug-in of the consumer.
#pragma once

#define PLUG_IN_API __attribute__((visibility("default")))

PLUG_IN_API void TimeInPlugIn(const char* name);
PLUG_IN_API bool IsPausedInPlugIn();
PLUG_IN_API void RecordInPlugIn();  // 240 bytes
