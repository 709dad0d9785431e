// What the web API offers.
#ifndef PROGRAMS_WEBAPI_REGISTRY_H_
#define PROGRAMS_WEBAPI_REGISTRY_H_

#include <json/value.h>

#include <ctime>
#include <functional>
#include <string>
#include <vector>

#include "owner/account.h"
#include "owner/argument.h"
#include "owner/problem.h"
#include "webapi/call.h"

namespace webapi {

// What a method works with.
struct Turn {
  const owner::Account& account;
  const Json::Value& arguments;  // checked against the method's list
  const owner::ServerPlace& place;
  std::time_t now;
  Json::Value& data;   // the method's answer; an empty object at first
  std::string& links;  // its member "links" in place of a tree, which takes a multiple of the room
  int& link;           // the row of the link that the method found or made, for the event log
  bool& is_event;  // whether a method that changes something leaves its line there; true at first
  // Writes the line of a change that is made: for a method that does more behind it. Otherwise it
  // is written when the method returns.
  const std::function<void()>& note_change;
};

struct Method {
  const char* name;
  bool changes;  // needs a POST, and leaves a line in the event log under its name
  std::vector<owner::Argument> arguments;
  owner::MaybeProblem (*run)(Turn* turn);
};

struct Api {
  const char* name;
  int min_version;
  int max_version;
  std::vector<Method> methods;
};

const std::vector<Api>& Apis();

// The method that `call` names: checks the API, then the version, then the method.
owner::MaybeProblem FindMethod(const Call& call, const Method** method);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_REGISTRY_H_
