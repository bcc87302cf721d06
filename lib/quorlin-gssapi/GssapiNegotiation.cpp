// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <quorlin-gssapi/GssapiNegotiation.h>

#include "quorlin-gssapi/GssCredential.h"
#include "quorlin-gssapi/GssHandles.h"
#include "quorlin-gssapi/GssStatus.h"

#include <pelmar/Exception.h>
#include <pelmar/SecretText.h>
#include <quorlin/Exceptions.h>

#include <boost/make_shared.hpp>

#include <utility>

namespace Quorlin {

namespace {

using InternalApi::AcquireSpnegoCredential;
using InternalApi::DescribeStatus;
using InternalApi::GetSpnegoMechanism;
using InternalApi::GssBuffer;
using InternalApi::GssContext;
using InternalApi::GssCredential;
using InternalApi::GssName;
using InternalApi::GssStatus;
using InternalApi::IsFaultOf;

// SPNEGO protects its choice of mechanism by an integrity code (RFC 4178, section 5).
constexpr OM_uint32 kFlags = GSS_C_MUTUAL_FLAG | GSS_C_INTEG_FLAG;

void WipeAndDelete(Leg* leg) {
  Pelmar::Wipe(*leg);
  delete leg;
}

void RequireNoNul(const std::string& text) {
  if (text.find('\0') != std::string::npos) {
    throw Pelmar::InvalidArgumentException("GssapiOptions must not contain NUL characters");
  }
}

void RequireUsable(const GssapiOptions& options) {
  const std::string& target = options.targetService;
  const std::size_t at = target.find('@');
  // Without a host Kerberos would quietly take this machine's.
  if (at == std::string::npos || at == 0 || at + 1 == target.size()) {
    throw Pelmar::InvalidArgumentException("GssapiOptions::targetService must be SERVICE@HOST");
  }
  RequireNoNul(target);
  RequireNoNul(options.principal);
  RequireNoNul(options.credentialCache);
}

GssName ImportService(const std::string& service) {
  gss_buffer_desc text = {service.size(), const_cast<char*>(service.c_str())};
  GssName name;
  GssStatus status;
  status.major = gss_import_name(&status.minor, &text, GSS_C_NT_HOSTBASED_SERVICE, name.Place());
  if (GSS_ERROR(status.major)) {
    throw Pelmar::InvalidArgumentException("GssapiOptions::targetService '" + service +
                                           "' cannot be used: " + DescribeStatus(status));
  }
  return name;
}

class GssapiNegotiationHandlerImpl final : public GssapiNegotiationHandler {
 public:
  explicit GssapiNegotiationHandlerImpl(const GssapiOptions& options)
      : _options(options), _target(ImportService(options.targetService)) {}

  boost::shared_ptr<Leg> Negotiate(const Leg& serverLeg) override;
  bool IsComplete() const override { return _state == State::COMPLETE; }
  void RequireComplete() const override;

 private:
  enum class State { NEW, RUNNING, COMPLETE, FAILED };

  void Begin(const Leg& serverLeg);
  boost::shared_ptr<Leg> Step(const Leg& serverLeg);
  [[noreturn]] void ThrowFailure(const GssStatus& status) const;
  std::string DescribeTarget() const { return "Kerberos negotiation with '" + _options.targetService + "'"; }

  const GssapiOptions _options;
  const GssName _target;
  GssCredential _credential;
  GssContext _context;
  State _state = State::NEW;
};

boost::shared_ptr<Leg> GssapiNegotiationHandlerImpl::Negotiate(const Leg& serverLeg) {
  // Some services confirm what is already settled: whatever they say now cannot change it.
  if (_state == State::COMPLETE) {
    return boost::shared_ptr<Leg>();
  }
  // Whatever throws below, there is no way on from there.
  const State before = std::exchange(_state, State::FAILED);
  if (before == State::FAILED) {
    throw Pelmar::InvalidStateException(DescribeTarget() + " has failed and cannot go on");
  }
  if (before == State::NEW) {
    Begin(serverLeg);
  } else if (serverLeg.empty()) {
    throw SsoException(DescribeTarget() + " failed: the service sent an empty leg");
  }
  return Step(serverLeg);
}

void GssapiNegotiationHandlerImpl::Begin(const Leg& serverLeg) {
  if (!serverLeg.empty()) {
    throw Pelmar::InvalidArgumentException("a negotiation starts without a leg of the service");
  }
  _credential = AcquireSpnegoCredential(_options.principal, _options.credentialCache);
}

boost::shared_ptr<Leg> GssapiNegotiationHandlerImpl::Step(const Leg& serverLeg) {
  gss_buffer_desc input = {serverLeg.size(), const_cast<unsigned char*>(serverLeg.data())};
  GssBuffer output;
  OM_uint32 flags = 0;
  GssStatus status;
  status.mechanism = GetSpnegoMechanism();
  status.major = gss_init_sec_context(&status.minor, _credential.Get(), _context.Place(), _target.Get(),
                                      status.mechanism, kFlags, 0, GSS_C_NO_CHANNEL_BINDINGS, &input, nullptr,
                                      output.Place(), &flags, nullptr);
  if (GSS_ERROR(status.major)) {
    ThrowFailure(status);
  }
  const bool isComplete = (status.major & GSS_S_CONTINUE_NEEDED) == 0;
  if (isComplete && (flags & GSS_C_MUTUAL_FLAG) == 0) {
    throw SsoException(DescribeTarget() + " failed: the service did not prove its identity");
  }
  const boost::shared_ptr<Leg> leg(new Leg(output.begin(), output.end()), &WipeAndDelete);
  if (!isComplete && leg->empty()) {
    throw SsoException(DescribeTarget() + " failed: it is not complete, and there is nothing left to say");
  }
  _state = isComplete ? State::COMPLETE : State::RUNNING;
  return leg->empty() ? boost::shared_ptr<Leg>() : leg;
}

void GssapiNegotiationHandlerImpl::ThrowFailure(const GssStatus& status) const {
  // First of all: the text of a minor code is only there until the next call.
  const std::string message = DescribeTarget() + " failed: " + DescribeStatus(status);
  if (IsFaultOf(_credential, status.major)) {
    throw InvalidCredentialsException(message);
  }
  throw SsoException(message);
}

void GssapiNegotiationHandlerImpl::RequireComplete() const {
  if (!IsComplete()) {
    throw SsoException(DescribeTarget() + " is not complete: the service did not prove its identity");
  }
}

}  // namespace

boost::shared_ptr<GssapiNegotiationHandler> CreateGssapiNegotiationHandler(const GssapiOptions& options) {
  RequireUsable(options);
  return boost::make_shared<GssapiNegotiationHandlerImpl>(options);
}

}  // namespace Quorlin
