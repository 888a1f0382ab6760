#pragma once
// The JSON layer in one include: trees, text, conversions and service times.

#include "foundation/json/ISO8601Time.h"
#include "foundation/json/JSONConvert.h"
#include "foundation/json/JSONText.h"
#include "foundation/json/JSONTree.h"
