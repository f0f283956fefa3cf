// A library that is loaded and unloaded; built twice, with two names for the line below.
#include <cstdlib>

void* volatile gPlugInSink;

extern "C" void PlugInRun() {
#line 1 PLUG_IN_NAME
    for (int i = 0; i < PLUG_IN_COUNT; ++i) gPlugInSink = std::malloc(PLUG_IN_COUNT);
}
