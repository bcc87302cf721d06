// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The names that the pages' shorter pieces of code take for granted. They are only ever compiled, never linked.

#ifndef QUORLIN_TESTS_DOCS_PRELUDE_H
#define QUORLIN_TESTS_DOCS_PRELUDE_H

#include <pelmar/Reader.h>
#include <pelmar/service/Logger.h>
#include <pelmar/xml/Node.h>
#include <pelmar/xml/Parser.h>
#include <quorlin-gssapi/GssapiNegotiation.h>
#include <quorlin/TokenProvider.h>
#include <quorlin/quorlin.h>

#include <boost/make_shared.hpp>

#include <iostream>
#include <list>
#include <string>
#include <vector>

void PrintToken(const Quorlin::SamlToken& token);
std::string ReadFile(const std::string& path);
Quorlin::Leg StepOfYourMechanism(const Quorlin::Leg& serverLeg);
Pelmar::Xml::ElementNode* FindTheAssertion(Pelmar::Xml::ElementNode* envelope);

extern Quorlin::SecurityTokenServiceConfig config;
extern boost::shared_ptr<Quorlin::SecurityTokenService> service;
extern boost::shared_ptr<const Quorlin::SamlToken> token;
extern Quorlin::TokenSpec spec;
extern Quorlin::TokenCompletion done;
extern std::string user;
extern boost::shared_ptr<Quorlin::TokenProvider> provider;
extern std::string password;
extern std::string target;
extern std::string xml;
extern std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> trusted;
extern std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>> trustedStsCertificates;

#endif  // QUORLIN_TESTS_DOCS_PRELUDE_H
