// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Fills a store with trust anchors. Only for the sources of the ssl layer.

#ifndef PELMAR_SSL_TRUSTANCHORS_H
#define PELMAR_SSL_TRUSTANCHORS_H

#include <pelmar/crypto/Certificate.h>

#include <list>
#include <string>

struct x509_store_st;

namespace Pelmar {
namespace Ssl {

/// Null entries are skipped. Throws CryptoException, as all of these do.
void AddCertificates(x509_store_st* store, const std::list<Ref<const Crypto::Certificate>>& certificates);

/// All certificates of the PEM file `path`; at least one.
void AddFile(x509_store_st* store, const std::string& path);

/// The directory `path`, in which certificates are looked up by the hash of their subject when they are
/// needed.
void AddDirectory(x509_store_st* store, const std::string& path);

/// What the operating system trusts: the file and the directory that OpenSSL was built to use, not those that
/// the environment names.
void AddSystemStore(x509_store_st* store);

}  // namespace Ssl
}  // namespace Pelmar

#endif  // PELMAR_SSL_TRUSTANCHORS_H
