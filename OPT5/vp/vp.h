// Value-set propagation: which integers a variable may hold.
#pragma once

void do_value_propagation();
