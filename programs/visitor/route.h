// What a request's address asks for.
#ifndef PROGRAMS_VISITOR_ROUTE_H_
#define PROGRAMS_VISITOR_ROUTE_H_

#include <string>
#include <string_view>

namespace visitor {

// Where the web server mounts the program; also the path of the visitor's cookie.
inline constexpr std::string_view kMountPath = "/sharing";

// The parameter that asks a link of the redirect type "url_param" to send its visitor on.
inline constexpr std::string_view kRedirectParameter = "redirect";

// What the path leads to.
enum class Place { kNowhere, kLink, kLogout };

struct Route {
  Place place = Place::kNowhere;
  std::string hash;  // empty for kNowhere
};

// Reads CGI's PATH_INFO: "/<hash>" or "/<hash>/logout"; anything else leads nowhere.
Route ParseRoute(std::string_view path_info);

// The address, without the host, of a link and of its logout page. Precondition:
// common::IsHashText.
std::string LinkPath(std::string_view hash);
std::string LogoutPath(std::string_view hash);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_ROUTE_H_
