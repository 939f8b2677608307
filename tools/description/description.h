/// What a program's interface is, for machines. Each program has a file that says it.
#pragma once

#include <string>

std::string description();
