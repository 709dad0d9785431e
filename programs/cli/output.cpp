#include "cli/output.h"

#include <iostream>

#include "cli/display.h"
#include "owner/argument.h"
#include "owner/link_address.h"
#include "owner/link_json.h"

namespace cli {

std::string JsonLine(const Json::Value& value) {
  return HarmlessJson(owner::WriteJson(value));
}

void PrintJson(const Json::Value& value) {
  std::cout << JsonLine(value) << '\n';
}

std::string Counted(long long number, const std::string& thing) {
  return std::to_string(number) + " " + thing + (number == 1 ? "" : "s");
}

void Complain(const std::string& text) {
  std::cerr << "tuvosharing: " << Harmless(text) << std::endl;
}

Json::Value LinkWithAddress(const TUVO::sharing::record::Entry& link, std::time_t now) {
  const owner::LinkAddress address = owner::AddressOf(link, {});
  Json::Value json = owner::LinkJson(link, now);
  json["url"] = address.url;
  json["url_type"] = address.type;
  return json;
}

}  // namespace cli
