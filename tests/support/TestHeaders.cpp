#include "tests/support/TestHeaders.h"
