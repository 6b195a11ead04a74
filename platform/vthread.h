// The calling thread's identifier as the kernel knows it.
#pragma once

// VThreadBase_GetKernelID returns the kernel thread id (gettid), unique among
// the live threads of the system; used to give per-thread temporary files
// distinct names.
unsigned long VThreadBase_GetKernelID(void);
