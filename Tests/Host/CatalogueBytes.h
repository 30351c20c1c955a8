#pragma once

/// Compiled catalogues made by hand, for what the compiler of catalogues would not write.

#include <map>
#include <string>

/// The bytes of a catalogue in UTF-8, without a hash table, that holds these texts beside its header. Texts may be empty.
std::string catalogueBytes(std::map<std::string, std::string> texts);
