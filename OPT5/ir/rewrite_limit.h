#pragma once

struct NODE;

/**
 * Rewrites one by one, for whoever looks for the one that breaks a program. A pass that could leave out any of its
 * rewrites asks `rewrite_is_allowed` ahead of each; with `--debug:limit=N` the first N are, and no others. With
 * `--debug:rows=M` beside it only those of the M-th run of a row are counted. Passes whose rewrites need each other
 * do not ask.
 */
extern bool rewrites_are_counted;

/** Takes note of a row's run: `is_last` if it is the one that --debug:rows ends with. */
void begin_counted_rewrites(bool is_last);

/** Of a rewrite of, or for the sake of, this tree (borrowed; null if there is none to show). */
bool counted_rewrite_is_allowed(const NODE* tree);

inline bool rewrite_is_allowed(const NODE* tree) { return !rewrites_are_counted || counted_rewrite_is_allowed(tree); }
