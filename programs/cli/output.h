// What the commands print.
#ifndef PROGRAMS_CLI_OUTPUT_H_
#define PROGRAMS_CLI_OUTPUT_H_

#include <json/value.h>
#include <tuvosharing/entry.h>

#include <ctime>
#include <string>

namespace cli {

// One line of JSON on standard output.
void PrintJson(const Json::Value& value);
std::string JsonLine(const Json::Value& value);

// "1 link", "2 links": the number with the thing's name, in the plural where it has to be.
std::string Counted(long long number, const std::string& thing);

// One line on standard error: "tuvosharing: " and the text.
void Complain(const std::string& text);

// The link's object with its address, "url" and "url_type".
Json::Value LinkWithAddress(const TUVO::sharing::record::Entry& link, std::time_t now);

}  // namespace cli

#endif  // PROGRAMS_CLI_OUTPUT_H_
