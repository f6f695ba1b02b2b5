// The target's rule base and the matcher on it.
#pragma once

// Builds the rule base from the compiled tables.
void matcher_init();

// Checks the machine description; `target_only` keeps what applies to the current version alone.
void parse_md_file(bool target_only);
