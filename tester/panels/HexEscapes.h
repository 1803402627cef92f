#pragma once

class QString;

/// Which letters count as hexadecimal digits.
enum class HexDigits { UpperCase, AnyCase };

/**
 * Replaces every backslash, x and exactly @p digits hexadecimal digits by the character of that code modulo 256.
 *
 * The search goes on at the character just inserted: it can be the backslash of the next escape.
 */
void expandHexEscapes(QString &text, int digits, HexDigits allowed);
