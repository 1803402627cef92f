#pragma once

#include <cstdint>
#include <span>

/// A name of the catalogue and its identifier.
struct AttributeName {
    const char *name;
    std::uint64_t attribute;
};

/**
 * All attributes that the attributes page offers, in its order.
 *
 * Some identifiers stand in it twice: the 64-bit names come first, their unsuffixed aliases later.
 */
std::span<const AttributeName> attributeCatalogue();
