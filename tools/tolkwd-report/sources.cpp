#include "sources.h"
