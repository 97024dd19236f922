#include "message.h"
