// The same checks compiled as C++: the header's extern "C" block and types work there too.
#include "header_check.c"
