// Texts from the database as they may be shown on a terminal.
#ifndef PROGRAMS_CLI_DISPLAY_H_
#define PROGRAMS_CLI_DISPLAY_H_

#include <cstddef>
#include <string>
#include <string_view>

namespace cli {

// `text` in UTF-8, without anything that a terminal obeys or that turns the order of what stands
// around it: control characters, line and paragraph separators and format characters are written
// as "\x1b" or "\u202e" (and "\n", "\t"); bytes that are no UTF-8 become U+FFFD.
std::string Harmless(std::string_view text);

// The same for JSON text, which stays JSON text of the same value.
std::string HarmlessJson(const std::string& json);

// How many columns of a terminal `text`, which Harmless made, takes.
std::size_t DisplayWidth(std::string_view text);

// `text`, which Harmless made, in at most `width` columns (1 or more): what does not fit is cut off
// and "…" put in its place.
std::string Cut(const std::string& text, std::size_t width);

}  // namespace cli

#endif  // PROGRAMS_CLI_DISPLAY_H_
