#include "tracker.h"
