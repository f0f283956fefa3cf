// Running a program with the recorder in it.
#ifndef ZANBASE_RECORD_RUN_H
#define ZANBASE_RECORD_RUN_H

#include "options.h"

namespace recorder {

// Runs the program to its end and says what there is to say; returns the exit status of the command.
int RunRecorded(RunOptions options);

}  // namespace recorder

#endif
