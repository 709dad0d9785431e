#include "webapi/link_api.h"

#include <tuvosharing/keys.h>

#include <string_view>

#include "owner/settings.h"

namespace webapi {

namespace {

using owner::Argument;
using owner::Kind;
using Arguments = std::vector<Argument>;

Arguments NamesALink() {
  return {{TUVO::sharing::SZK_ID_, Kind::kInteger}, {TUVO::sharing::SZK_HASH, Kind::kText}};
}

Arguments With(Arguments some, const Argument& another) {
  some.push_back(another);
  return some;
}

Arguments ForCreate() {
  Arguments arguments = owner::SettingArguments();
  for (Argument& argument : arguments) {
    argument.needed = std::string_view(argument.name) == TUVO::sharing::SZK_PROJECT_NAME;
  }
  return arguments;
}

Arguments ForList() {
  return {{"offset", Kind::kInteger},
          {"limit", Kind::kInteger},
          {"sort", Kind::kText},
          {"descending", Kind::kBoolean},
          {TUVO::sharing::SZK_OWNER_USER, Kind::kText},
          {TUVO::sharing::SZK_PROJECT_NAME, Kind::kText},
          {"state", Kind::kText},
          {"search", Kind::kText}};
}

Arguments ForDeleteExpired() {
  return {{TUVO::sharing::SZK_PROJECT_NAME, Kind::kText},
          {TUVO::sharing::SZK_OWNER_USER, Kind::kText},
          {"dry_run", Kind::kBoolean}};
}

}  // namespace

Api LinkApi() {
  const Argument id = {TUVO::sharing::SZK_ID_, Kind::kInteger, true};
  return {"TUVO.Sharing.Link",
          1,
          1,
          {{"create", true, ForCreate(), CreateMethod},
           {"get", false, With(NamesALink(), {"qr", Kind::kBoolean}), GetMethod},
           {"list", false, ForList(), ListMethod},
           {"set", true, With(owner::SettingArguments(), id), SetMethod},
           {"delete", true, NamesALink(), DeleteMethod},
           {"delete_expired", true, ForDeleteExpired(), DeleteExpiredMethod},
           {"sessions", false, NamesALink(), SessionsMethod},
           {"sign_out", true, NamesALink(), SignOutMethod}}};
}

}  // namespace webapi
