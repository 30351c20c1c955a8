#pragma once

/// Reads application/x-www-form-urlencoded text. Pure; whatever is no proper escape stands for itself.

#include <map>
#include <string>
#include <string_view>

namespace palisade::sandbox {

/// A name may occur several times.
using Form = std::multimap<std::string, std::string, std::less<>>;

Form parseForm(std::string_view text);

/// The field's value, the first of several; empty when there is none.
std::string field(const Form& form, std::string_view name);

/// The field's value as a whole number from 0 to `most`; `otherwise` when there is no such number.
long number(const Form& form, std::string_view name, long otherwise, long most);

}  // namespace palisade::sandbox
