// The C library's streams, seen from the start of the recording, or from the first stream that a library's
// constructor opens before that.
#ifndef ZANBASE_RECORD_STDIO_TABLES_H
#define ZANBASE_RECORD_STDIO_TABLES_H

namespace recorder {

// Counts what streams do from now on; further calls do nothing. False if the C library's tables are not as
// expected: then only opens of streams are counted.
bool HookStreams();

}  // namespace recorder

#endif
