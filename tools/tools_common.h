// Shared by the `tools` subcommands.
#pragma once

#include <cstdio>
#include <string>
#include <vector>

#include "command.h"
#include "log_lines.h"
#include "tvx_log.h"

namespace tvxcli {

inline constexpr const char *kToolsGroup = "tools";

}  // namespace tvxcli
