#pragma once

void insert_PT_checks(); // nothing without the switch; needs `fact::points_to`
