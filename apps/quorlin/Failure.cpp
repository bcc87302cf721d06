// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/Failure.h"

#include "quorlin/ConnectionAdvice.h"

#include <pelmar/http/HttpException.h>
#include <pelmar/xml/Parser.h>
#include <pelmar/xml/security/Exceptions.h>
#include <quorlin/Exceptions.h>

#include <cxxabi.h>

#include <cstdlib>
#include <memory>
#include <typeinfo>

namespace Cli {

namespace {

constexpr const char* kNoAssertion = "Expected element 'Assertion' not found.";

std::string GetUnqualifiedName(const std::type_info& type) {
  int status = 0;
  const std::unique_ptr<char, void (*)(void*)> name(
      abi::__cxa_demangle(type.name(), nullptr, nullptr, &status), std::free);
  const std::string text = name != nullptr ? name.get() : type.name();
  const std::size_t colon = text.rfind("::");
  return colon == std::string::npos ? text : text.substr(colon + 2);
}

template <typename T>
bool Is(const std::exception& e) {
  return dynamic_cast<const T*>(&e) != nullptr;
}

/// A bad URL is the only thing that the HTTP layer reports to a caller of the library.
bool IsUsage(const std::exception& e) {
  return Is<UsageException>(e) || Is<Pelmar::InvalidArgumentException>(e) ||
         Is<Pelmar::InvalidStateException>(e) || Is<Pelmar::Http::HttpException>(e);
}

ExitCode GetExitCode(const std::exception& e, ExitCode otherwise) {
  if (Is<Quorlin::CommunicationException>(e)) {
    return EXIT_UNREACHABLE;
  }
  if (Is<Quorlin::SsoException>(e) || Is<Pelmar::Xml::XMLParseException>(e)) {
    return EXIT_REFUSED;
  }
  if (IsUsage(e)) {
    return EXIT_USAGE;
  }
  return Is<Pelmar::Exception>(e) ? otherwise : EXIT_FAILED;
}

std::string GetAdvice(const std::exception& e) {
  if (Is<Quorlin::CommunicationException>(e)) {
    return AdviseOnConnection(e.what());
  }
  if (Is<Quorlin::InvalidCredentialsException>(e)) {
    return "Check the user name and the password.";
  }
  if (Is<Quorlin::InvalidSignatureException>(e)) {
    return "The token must be signed with a certificate that --sts-cert or --trust names, or that chains to one of them, "
           "and must not have been changed on its way.";
  }
  if (Is<Pelmar::Xml::Security::XmlSecurityException>(e) &&
      std::string(e.what()).rfind("Signature method ", 0) == 0) {
    return "Requests are signed with RSA and SHA-256: the key of --key has to be an RSA key.";
  }
  if (Is<Pelmar::Xml::XMLParseException>(e)) {
    return "That is not the XML of a token, which is one document in UTF-8.";
  }
  if (Is<Quorlin::ParseException>(e) && e.what() == std::string(kNoAssertion)) {
    return "The document is no SAML 2.0 assertion. If it holds one, as a SOAP answer does, quorlin verify --embedded finds "
           "it.";
  }
  return "";
}

Failure Describe(const std::exception& e, ExitCode otherwise) {
  return {GetUnqualifiedName(typeid(e)), e.what(), false, GetExitCode(e, otherwise), GetAdvice(e)};
}

}  // namespace

Failure DescribeCurrentException(ExitCode otherwise) {
  try {
    throw;
  } catch (const std::exception& e) {
    return Describe(e, otherwise);
  } catch (const Pelmar::Exception* e) {
    // Some errors of the token parser are thrown by pointer; whoever catches one owns it.
    const std::unique_ptr<const Pelmar::Exception> owner(e);
    Failure failure = Describe(*e, otherwise);
    failure.byPointer = true;
    return failure;
  } catch (...) {
    return {"unknown", "something was thrown that is no exception", false, EXIT_FAILED, ""};
  }
}

}  // namespace Cli
