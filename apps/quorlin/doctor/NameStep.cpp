// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/ConnectionAdvice.h"
#include "quorlin/doctor/Steps.h"

#include <netdb.h>

#include <cstring>
#include <future>
#include <thread>

namespace Cli {
namespace Doctor {

namespace {

/// More addresses than a service has, and few enough to try them all.
constexpr std::size_t kMaxAddresses = 8;

struct AddressListDeleter {
  void operator()(addrinfo* list) const noexcept { freeaddrinfo(list); }
};

/// What the resolver answers.
struct Lookup {
  int error = 0;
  std::unique_ptr<addrinfo, AddressListDeleter> list;
};

Lookup ResolveNow(const std::string& host, const std::string& port) {
  addrinfo hints = {};
  hints.ai_family = AF_UNSPEC;
  hints.ai_socktype = SOCK_STREAM;
  hints.ai_flags = AI_NUMERICSERV;
  addrinfo* list = nullptr;
  Lookup lookup;
  lookup.error = getaddrinfo(host.c_str(), port.c_str(), &hints, &list);
  lookup.list.reset(lookup.error == 0 ? list : nullptr);
  return lookup;
}

/// The resolver takes as long as it likes, so it works on a thread that need not be waited for. Absent: it
/// took too long.
std::optional<Lookup> Resolve(const Patient& patient) {
  std::packaged_task<Lookup()> task([host = patient.parts.host, port = std::to_string(patient.parts.port)] {
    return ResolveNow(host, port);
  });
  std::future<Lookup> lookup = task.get_future();
  std::thread(std::move(task)).detach();
  if (lookup.wait_for(patient.timeout) != std::future_status::ready) {
    return std::nullopt;
  }
  return lookup.get();
}

std::string Print(const addrinfo& entry, int port) {
  char text[NI_MAXHOST] = "";
  if (getnameinfo(entry.ai_addr, entry.ai_addrlen, text, sizeof text, nullptr, 0, NI_NUMERICHOST) != 0) {
    return "?";
  }
  const std::string address = text;
  return (entry.ai_family == AF_INET6 ? "[" + address + "]" : address) + ":" + std::to_string(port);
}

std::vector<Address> CollectAddresses(const Lookup& lookup, int port) {
  std::vector<Address> addresses;
  for (const addrinfo* entry = lookup.list.get(); entry != nullptr && addresses.size() < kMaxAddresses;
       entry = entry->ai_next) {
    Address address = {};
    if (entry->ai_addrlen <= sizeof address.bytes) {
      std::memcpy(&address.bytes, entry->ai_addr, entry->ai_addrlen);
      address.size = entry->ai_addrlen;
      address.text = Print(*entry, port);
      addresses.push_back(address);
    }
  }
  return addresses;
}

Outcome Refuse(const Patient& patient, const std::string& reason) {
  const std::string message = "Host " + patient.parts.host + " was not found";
  return Fail(EXIT_UNREACHABLE, message + " (" + reason + ")", AdviseOnConnection(message));
}

Outcome Describe(const Patient& patient, const std::vector<Address>& addresses) {
  Outcome outcome = Pass(patient.parts.host + " has ");
  std::string texts;
  for (const Address& address : addresses) {
    const std::string text = address.text.substr(0, address.text.rfind(':'));
    texts += (texts.empty() ? "" : ", ") + text;
    outcome.data["addresses"].push_back(text);
  }
  outcome.found += (addresses.size() == 1 ? "the address " : "the addresses ") + texts;
  if (IsAddress(patient.parts.host)) {
    outcome.found = patient.parts.host + " is an address";
  }
  return outcome;
}

}  // namespace

Outcome CheckName(const Patient& patient, Findings& findings) {
  const std::optional<Lookup> lookup = Resolve(patient);
  if (!lookup) {
    return Refuse(patient, "no answer within " + DescribeTimeout(patient));
  }
  if (lookup->error != 0) {
    return Refuse(patient, gai_strerror(lookup->error));
  }
  findings.addresses = CollectAddresses(*lookup, patient.parts.port);
  if (findings.addresses.empty()) {
    return Refuse(patient, "no address of the Internet protocols");
  }
  return Describe(patient, findings.addresses);
}

}  // namespace Doctor
}  // namespace Cli
