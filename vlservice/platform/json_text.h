#pragma once
// JSON text as a header of the platform layer, where programs look for it.

#include "vlservice/json/json_text.h"
