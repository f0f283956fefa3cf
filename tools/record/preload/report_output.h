// Where reports and messages of the preload library are written.
#ifndef ZANBASE_RECORD_REPORT_OUTPUT_H
#define ZANBASE_RECORD_REPORT_OUTPUT_H

#include <string>

#include "common/settings.h"

namespace recorder {

// Copies standard error to a high number, since programs close it before they exit, and keeps the result's
// descriptor from programs that are not recorded. From then on OwnDescriptors tells both.
void TakeDescriptors(const Settings& settings);

// Moves the one of OwnDescriptors that is `number`: the program is about to put another file there.
void VacateDescriptor(int number);

// Keeps memory for the last report of a program that uses up its own.
void ReserveMemory();

// Writes a line to standard error as the program found it.
void Say(const std::string& text);

// Makes the report and writes it; `process` is the number that %p in the output's name stands for. The last
// also tells the command which budgets broke.
// Requires: the thread is inside the recorder.
void Report(const Settings& settings, int process, bool is_last);

}  // namespace recorder

#endif
