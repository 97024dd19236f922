#include "logreader.h"
