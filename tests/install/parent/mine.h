#pragma once
#include "util/WildcardMatcher.h"

bool matchesAll(const char* text);
