#include "vx/classmetadata.h"

ClassMetaData::~ClassMetaData() = default;
