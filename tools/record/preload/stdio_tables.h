// The C library's streams, seen from the start of the recording.
#ifndef ZANBASE_RECORD_STDIO_TABLES_H
#define ZANBASE_RECORD_STDIO_TABLES_H

namespace recorder {

// Counts what streams do from now on. False if the C library's tables are not as expected: then only opens of
// streams are counted.
bool HookStreams();

}  // namespace recorder

#endif
