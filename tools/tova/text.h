// Plain-text form of a report value, for people: members of an object one a
// line with aligned values, nested objects indented under "key:", arrays of
// plain values on one line and arrays of objects as tables with a header row.
#pragma once

#include <string>
#include <string_view>

#include "json.h"

namespace tova_cli {

// A text safe to print on a terminal: control bytes and bytes that are not
// part of valid UTF-8 become \xNN.
std::string printable(std::string_view s);

// Characters (not bytes) of a printable text, for column widths.
size_t displayWidth(std::string_view s);

// Text of a plain value as a table cell or member value.
std::string scalarText(const Value& value);

std::string toText(const Value& value);

}  // namespace tova_cli
