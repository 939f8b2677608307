#include "tasks/home.h"

const char* ZAV_TOVRINHOME = nullptr;
