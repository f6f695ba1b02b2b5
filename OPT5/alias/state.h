// What the sources of this room share of the marks.
#pragma once

class SYMTAB;

bool marks_are_known();                             // `init_aliasing_info` ran for the current function
bool may_be_reached_by_pointers(const SYMTAB* sym); // true as well while the marks are not known
bool groups_are_known();                            // the groups of pointers, for the current function
void forget_groups();
