#pragma once

#include <string>

/// Whether two texts are JSON of the same value: the same members and elements in the same order, the same
/// strings, and numbers that are equal digit for digit, however they are written. No number is read into a
/// type that could round it. False when one of the texts is no JSON.
bool IsSameJson(const std::string& one, const std::string& other);
