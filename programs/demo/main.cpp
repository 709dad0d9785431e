// tuvosharing-demo-links: the demonstration's links. Runs as root or as the system identity (uid
// 1).
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "create.h"
#include "inspect.h"

namespace {

constexpr int kUsageError = 2;

int Run(const std::vector<std::string>& arguments) {
  const std::string command = arguments.empty() ? "" : arguments[0];
  if (command == "create" && arguments.size() == 3) {
    return demo::CreateLinks(arguments[1], arguments[2]) ? 0 : 1;
  }
  if (command == "show" && arguments.size() == 2) {
    return demo::ShowLink(arguments[1]) ? 0 : 1;
  }
  if (command == "authorized" && arguments.size() == 4) {
    demo::ShowAuthorization(arguments[1], arguments[2], arguments[3]);
    return 0;
  }
  std::cerr << "usage: tuvosharing-demo-links create FILE OWNER\n"
               "       tuvosharing-demo-links show HASH\n"
               "       tuvosharing-demo-links authorized HASH SESSION ADDRESS\n";
  return kUsageError;
}

}  // namespace

int main(int argc, char** argv) {
  try {
    return Run({argv + 1, argv + argc});
  } catch (const std::exception& error) {
    std::cerr << error.what() << '\n';
    return 1;
  }
}
