#include "OPT5/driver/driver.h"

int main(int argc, char** argv) { return zopt_main(argc, argv); }
