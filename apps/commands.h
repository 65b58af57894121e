#pragma once
#include "options.h"

int cmdCapabilities(const CliOptions& o);
