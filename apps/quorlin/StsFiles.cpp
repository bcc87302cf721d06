// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include "quorlin/StsFiles.h"

#include "quorlin/Files.h"

namespace Cli {

StsFiles WriteCertificates(const DevSts::Service& service, const std::string& directory) {
  StsFiles files;
  files.stsCertificate = directory + "/sts.pem";
  WriteFile(files.stsCertificate, service.GetSigningCertificate(), Readers::EVERYBODY);
  if (!service.GetServerCertificate().empty()) {
    files.ca = directory + "/ca.pem";
    WriteFile(files.ca, service.GetCaCertificate(), Readers::EVERYBODY);
    WriteFile(directory + "/server.pem", service.GetServerCertificate(), Readers::EVERYBODY);
  }
  return files;
}

}  // namespace Cli
