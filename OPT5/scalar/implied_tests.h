// Whether one condition decides another.
#pragma once

class NODE;

// What `q` is where `p` has the truth value `sense`: 1 true, 0 false, -1 unknown. Neither may have side effects; both
// are evaluated on the same values. A NaN is no integer: floating conditions decide only themselves and their exact
// opposite.
int pred_implies_pred(const NODE* p, bool sense, const NODE* q);
