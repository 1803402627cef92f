#pragma once

/**
 * The random numbers of the stress tests. Nobody seeds them: each run of a test has a thread of its own, and so begins with
 * the same numbers of qrand; those of rand go on through the whole process.
 */
namespace randomnumbers
{

/// 0 to @p limit - 1, from qrand.
unsigned below(unsigned limit);
/// True for an odd number of qrand.
bool odd();
/// A width of 0 to @p limit - 1, from qrand and an offset of 5.
int width(unsigned limit);

} // namespace randomnumbers
