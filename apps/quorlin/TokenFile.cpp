// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/TokenFile.h"

#include "quorlin/Files.h"

#include <pelmar/xml/Parser.h>

namespace Cli {

void AddTokenFileOption(CLI::App& command, std::string& file) {
  command.add_option("--token", file, "The token you have; - is standard input")
      ->required()
      ->type_name("FILE");
}

boost::shared_ptr<const Quorlin::SamlToken> ReadToken(const std::string& file,
                                                      const Quorlin::SecurityTokenServiceConfig& config) {
  return ReadToken(file, config.trustedStsCertificates);
}

boost::shared_ptr<const Quorlin::SamlToken> ReadToken(
    const std::string& file, const std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>& trusted) {
  return Quorlin::CreateSamlToken(ReadFileUpTo(file, Pelmar::Xml::kMaxDocumentBytes + 1), trusted);
}

}  // namespace Cli
