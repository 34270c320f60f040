// The owning handles live in include/filehandle.h, below every folder of the library; this
// name stays for sources written against it.
#pragma once

#include "../include/filehandle.h"
