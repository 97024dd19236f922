#include "instant.h"
