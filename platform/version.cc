#include "tvx_base.h"

extern "C" TVX_EXPORT const char *Tvx_GetVersion(void) { return TVX_VERSION_TEXT; }
