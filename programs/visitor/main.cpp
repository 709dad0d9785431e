// sharing.cgi: serves the visitors of sharing links, behind a web server.
#include "common/gateway.h"
#include "visitor/service.h"

int main() {
  return common::RunGateway(
      {visitor::RequestVariables(), visitor::ServeExchange, visitor::Apologize, visitor::IsFit});
}
