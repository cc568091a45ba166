#include <corvane/c/corvane.h>

corvane_error error_of_cpp = CORVANE_ERROR_INIT;
