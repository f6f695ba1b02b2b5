// Not built yet: nothing is decided.
#include "OPT5/dd/dependence.h"

bool dependence_analysis_enabled = false;
int virtual_init_count = 0;

void init_dependence_analysis() {}
void redo_dependence_analysis(struct LOOP*) {}
void wrapup_dependence_analysis(bool) {}
void flush_DDEPNODEs_for_loop(struct LOOP*) {}
void report_all_dependences() {}
DDEPNODE* get_DDEPNODE_from_tree(const NODE*) { return nullptr; }
struct LOOP* get_loop_from_DDEPNODE_tree(const NODE*) { return nullptr; }

bool lvalues_collide_in_iteration(const NODE*, const NODE*, struct LOOP*) { return true; }
bool lvalues_have_non_carried_dDeps_in_loop(const NODE*, const NODE*, struct LOOP*) { return true; }
bool lvalues_are_dependent(const NODE*, const NODE*, struct LOOP*, struct LOOP*) { return true; }
bool tree_affects_tree(const NODE*, const NODE*, struct LOOP*, struct LOOP*, bool) { return true; }
bool trees_are_dependent(const NODE*, const NODE*, struct LOOP*, struct LOOP*, bool) { return true; }
