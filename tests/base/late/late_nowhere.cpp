#include "tests/base/late/late_sample.h"

int LateNowhere::anything() { return 0; }
