#pragma once

/// Expands the abbreviations of a sensor's ID string into words, behind fifteen blanks. `inLen` is
/// not used; the result is bounded by outLen. Always 0. No step of the collection calls it.
int Translate_SDRString(char* in, char* out, unsigned int inLen, unsigned int outLen);
