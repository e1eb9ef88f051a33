#pragma once
// UString in the legacy byte forms of CStream.
//
// Every byte string is in the system ANSI encoding (UString::kSystemEncoding);
// characters it cannot hold are written as '?'. Stream errors propagate as
// from CStream; a negative byte count reads or writes nothing.

#include "tarn/Streams/CStream.h"

namespace tarn {

class UString;

// The bytes only: no length, no terminator.
void PutUStringAsCharArray(CStream& stream, const UString& s);
// The bytes up to the first NUL character, and a terminating NUL.
void PutUStringAsStr(CStream& stream, const UString& s);
// A Pascal string of at most 255 bytes.
void PutUStringAsStr255(CStream& stream, const UString& s);
// Exactly `size` bytes: a Pascal string of at most size - 2 characters,
// zero-padded.
void PutUStringAsFixedSizeUCharArray(CStream& stream, int size, const UString& s);

void GetCharArrayAsUString(CStream& stream, int count, UString& s);
void GetUCharArrayAsUString(CStream& stream, int count, UString& s);
// Reads `size` bytes and decodes the Pascal string they hold (its length cut
// to the field).
void GetFixedSizeUCharArrayAsUString(CStream& stream, int size, UString& s);
void GetStr255AsUString(CStream& stream, UString& s);
// GetLimitedStr255 with `max` (at most 256).
void GetLimitedStr255AsUString(CStream& stream, UString& s, short max);
// A NUL-terminated string of at most 1,000 bytes.
void GetStrAsUString(CStream& stream, UString& s);

}  // namespace tarn
