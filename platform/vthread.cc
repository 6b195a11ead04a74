#include "platform/vthread.h"

#include <sys/syscall.h>
#include <unistd.h>

unsigned long VThreadBase_GetKernelID(void) { return static_cast<unsigned long>(syscall(SYS_gettid)); }
