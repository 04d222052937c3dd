#include "util/Assert.h"
