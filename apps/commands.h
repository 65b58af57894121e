#pragma once
#include "options.h"

int cmdCapabilities(const CliOptions& o);
int cmdRender(const CliOptions& o);
int cmdCoverage(const CliOptions& o);
int cmdRecords(const CliOptions& o);
