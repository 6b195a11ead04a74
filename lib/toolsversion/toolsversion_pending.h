// The tools-image calls this subsystem makes.
#pragma once

#include "tvx_toolsiso.h"
#include "tvx_toolsiso_image.h"
