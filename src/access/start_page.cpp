// The Internet command: the documentation server's start page.
#include "access/start_page.h"

#include <string>

#include "access/opendoc.h"
#include "access/services.h"
#include "base/trace.h"

namespace {

constexpr std::size_t kAddressCapacity = 260;
constexpr std::size_t kMessageCapacity = 512;

}  // namespace

bool OpenStartPage(AccessServices& services) {
  Get_Doc_Server();
  const std::string address = std::string(DocumentServerURL) + "/about.php";
  TraceMessage("Document Server URL: ", address.c_str());

  // An address beyond its capacity is not opened cut short: it would lead
  // somewhere else.  The user hears of it like of any other failure.
  bool fits = address.size() < kAddressCapacity;
  if (!fits) TraceMessage("ERROR: document server address too long: ", address.c_str());
  if (fits && services.LaunchDefaultBrowser(address)) return true;

  std::string message = "Can't open document server url '" + address +
                        "'\n\nIt is probably internet error. Try later.";
  if (message.size() >= kMessageCapacity) message.resize(kMessageCapacity - 1);
  services.ShowError(message, "Lomari Docuvane Error");
  TraceMessage("ERROR: Can't open docuemnt server: ", address.c_str());
  return false;
}
