// Function-local statics that may live in the frame.
#include "OPT5/scalar/eda.h"

void identify_fl_statics_safe_for_auto() {}
void convert_safe_fl_statics_to_auto(FUNINFO*) {}
