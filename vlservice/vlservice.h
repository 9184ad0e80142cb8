#pragma once
// Everything public, the platform layer included.

#include "vlservice/cfg/cfg_node_id.h"
#include "vlservice/cfg/geometry.h"
#include "vlservice/cfg/id.h"
#include "vlservice/cfg/json.h"
#include "vlservice/extract/extracted_field.h"
#include "vlservice/extract/extracted_fields.h"
#include "vlservice/extract/ignore_on_group.h"
#include "vlservice/platform/cmd.h"
#include "vlservice/platform/json_text.h"
#include "vlservice/platform/local_time.h"
#include "vlservice/platform/log.h"
#include "vlservice/platform/uchar_alloc.h"
