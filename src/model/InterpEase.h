#pragma once

// The program's S-shaped ease curve: the value a fraction `t` (0 to 1) of the way from `a`
// to `b`, accelerating sinusoidally up to `e1`, at constant speed from `e1` to `e2` and
// decelerating sinusoidally from `e2` to 1 (0 <= e1 <= e2 <= 1). t == 0 gives exactly `a`,
// t == 1 exactly `b`. Callers pass 0 < t < 1 otherwise; t <= 0 with e1 == 0 divides by zero.
float interp_ease(float t, float a, float b, float e1, float e2);
