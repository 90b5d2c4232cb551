/// Writing the fields of event-data records: little-endian integers and bit fields.
#ifndef TAVIK_EVENTDATABYTES_H
#define TAVIK_EVENTDATABYTES_H

/// Sets one bit: bit n lives in byte n / 8 at position n mod 8. The field is long enough for it.
void TavikSet_BitField(unsigned char* apField, unsigned int aBit);

/// Sets every bit of so many bytes.
void TavikSet_AllBitField(unsigned char* apField, unsigned int aBytes);

/// Whether this host stores the least significant byte first. Any thread.
bool TavikIsLittleEndian();

/// Reverses so many bytes in place; nothing for fewer than 2.
void TavikReverseBytes(unsigned char* apBytes, unsigned int aCount);

/// Stores a 32-bit integer little-endian in four bytes.
void TavikStore32(unsigned char* apField, unsigned int aValue);

#endif
