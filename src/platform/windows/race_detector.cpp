// No race detector of this system is compiled into programs.
#include "platform/race_detector.h"

CallerFrame::CallerFrame(void*) noexcept {}

CallerFrame::~CallerFrame() = default;

void NoteRelease(const void*) noexcept {}

void NoteAcquire(const void*) noexcept {}
