#include <corvane/c/corvane.h>

corvane_error error_of_c = CORVANE_ERROR_INIT;
