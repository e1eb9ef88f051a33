#pragma once
// The broadcast-extension fields by the names the tool shows and edits
// (description, originator, ..., coding_history), so that `info`, `bext`
// and their JSON agree on one list.

#include <string>

#include "JsonWriter.h"
#include "tarn/Audio/SoundFileFormats/BWFBroadcastWaveExtension.h"

namespace tarnfile {

// Every field as "name: value" lines, each indented by `indent`.
void PrintBextFields(const tarn::BWFBroadcastWaveExtension& bext, const char* indent);
// Every field as one JSON object (texts as strings, numbers as numbers,
// the UMID as 128 hex digits).
void WriteBextJson(JsonWriter& json, const tarn::BWFBroadcastWaveExtension& bext);
// Sets the field `name` from `value`; throws UsageError for an unknown
// field or a value the field cannot hold.
void SetBextField(tarn::BWFBroadcastWaveExtension& bext, const std::string& name,
                  const std::string& value);

}  // namespace tarnfile
