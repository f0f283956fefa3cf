// The thread-safety annotations under the name by which the library's sources include them.
#ifndef ZANBASE_PLATFORM_THREAD_ANNOTATIONS_H
#define ZANBASE_PLATFORM_THREAD_ANNOTATIONS_H

#include "zanbase/thread_annotations.h"

#endif
