// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

#include <pelmar/crypto/Pkcs12.h>

#include "pelmar/crypto/CertificateImpl.h"
#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/OpenSslHandles.h"
#include "pelmar/crypto/Pkcs12Limits.h"
#include "pelmar/crypto/Pkcs12Profile.h"
#include "pelmar/crypto/PrivateKeyImpl.h"
#include "pelmar/crypto/SignatureValue.h"

#include <pelmar/crypto/CryptoException.h>
#include <pelmar/crypto/Digest.h>

#include <openssl/evp.h>
#include <openssl/pkcs12.h>

#include <utility>

namespace Pelmar {
namespace Crypto {

namespace {

void FreeSafes(STACK_OF(PKCS7) * safes) noexcept {
  sk_PKCS7_pop_free(safes, PKCS7_free);
}

void FreeBags(STACK_OF(PKCS12_SAFEBAG) * bags) noexcept {
  sk_PKCS12_SAFEBAG_pop_free(bags, PKCS12_SAFEBAG_free);
}

using FileHandle = std::unique_ptr<PKCS12, HandleDeleter<PKCS12_free>>;
using SafesHandle = std::unique_ptr<STACK_OF(PKCS7), HandleDeleter<FreeSafes>>;
using BagsHandle = std::unique_ptr<STACK_OF(PKCS12_SAFEBAG), HandleDeleter<FreeBags>>;

// OpenSSL's reasons are accidents of the place where the reading ended, so they are not told.
[[noreturn]] void Refuse(const std::string& what) {
  ClearOpenSslErrors();
  throw CryptoException("The PKCS #12 file " + what);
}

FileHandle ParseFile(const std::vector<unsigned char>& der) {
  if (der.size() > kMaxPkcs12Bytes) {
    Refuse("has more than " + std::to_string(kMaxPkcs12Bytes) + " bytes");
  }
  ClearOpenSslErrors();
  const unsigned char* position = der.data();
  FileHandle file(d2i_PKCS12(nullptr, &position, static_cast<long>(der.size())));
  if (!file) {
    Refuse("cannot be read");
  }
  if (position != der.data() + der.size()) {
    Refuse("is followed by other data");
  }
  return file;
}

/// Goes through one file and collects what it holds.
class Reader final {
 public:
  explicit Reader(const std::string& passPhrase)
      : _passPhrase(passPhrase.c_str()), _passPhraseSize(static_cast<int>(passPhrase.size())) {}

  /// Nothing is looked at, let alone decrypted, before the MAC is found right.
  void Read(PKCS12* file) {
    _profile.RequireMac(file);
    if (PKCS12_verify_mac(file, _passPhrase, _passPhraseSize) != 1) {
      Refuse("cannot be read: the pass phrase is wrong or the file is damaged");
    }
    const SafesHandle safes(PKCS12_unpack_authsafes(file));
    if (!safes) {
      Refuse("is damaged inside");
    }
    for (int i = 0; i < sk_PKCS7_num(safes.get()); ++i) {
      ReadSafe(sk_PKCS7_value(safes.get(), i));
    }
  }

  Pkcs12Content TakeContent() {
    if (!_key) {
      Refuse("holds no private key");
    }
    Pkcs12Content content;
    content.privateKey = _key;
    content.certificate = TakeCertificateOfKey();
    RequireWorkingKey(content);
    content.chain = TakeIssuersOf(ToCertificateImpl(content.certificate.Get()));
    return content;
  }

 private:
  void ReadSafe(PKCS7* safe) {
    const BagsHandle bags(UnpackSafe(safe));
    if (!bags) {
      Refuse("is damaged inside");
    }
    for (int i = 0; i < sk_PKCS12_SAFEBAG_num(bags.get()); ++i) {
      ReadBag(sk_PKCS12_SAFEBAG_value(bags.get(), i));
    }
  }

  STACK_OF(PKCS12_SAFEBAG) * UnpackSafe(PKCS7* safe) {
    CountObject();
    const int type = OBJ_obj2nid(safe->type);
    if (type == NID_pkcs7_data) {
      return PKCS12_unpack_p7data(safe);
    }
    if (type != NID_pkcs7_encrypted || safe->d.encrypted == nullptr ||
        safe->d.encrypted->enc_data == nullptr) {
      Refuse("has a part that is neither plain nor encrypted with the pass phrase");
    }
    _profile.RequireEncryption(safe->d.encrypted->enc_data->algorithm);
    return PKCS12_unpack_p7encdata(safe, _passPhrase, _passPhraseSize);
  }

  void ReadBag(const PKCS12_SAFEBAG* bag) {
    CountObject();
    switch (PKCS12_SAFEBAG_get_nid(bag)) {
      case NID_keyBag:
        ReadKey(PKCS12_SAFEBAG_get0_p8inf(bag));
        break;
      case NID_pkcs8ShroudedKeyBag:
        ReadEncryptedKey(bag);
        break;
      case NID_certBag:
        ReadCertificate(bag);
        break;
      default:
        Refuse("holds something that is neither a private key nor a certificate");
    }
  }

  void ReadEncryptedKey(const PKCS12_SAFEBAG* bag) {
    const X509_ALGOR* algorithm = nullptr;
    X509_SIG_get0(PKCS12_SAFEBAG_get0_pkcs8(bag), &algorithm, nullptr);
    _profile.RequireEncryption(algorithm);
    const Pkcs8Handle key(PKCS12_decrypt_skey(bag, _passPhrase, _passPhraseSize));
    ReadKey(key.get());
  }

  void ReadKey(const PKCS8_PRIV_KEY_INFO* info) {
    if (_key) {
      Refuse("holds more than one private key");
    }
    KeyHandle key(info == nullptr ? nullptr : EVP_PKCS82PKEY(info));
    if (!key) {
      Refuse("holds a private key that cannot be read");
    }
    ClearOpenSslErrors();
    _key = MakeRef<PrivateKeyImpl>(key.release());
  }

  void ReadCertificate(const PKCS12_SAFEBAG* bag) {
    const X509Handle x509(
        PKCS12_SAFEBAG_get_bag_nid(bag) == NID_x509Certificate ? PKCS12_SAFEBAG_get1_cert(bag) : nullptr);
    const int size = x509 ? i2d_X509(x509.get(), nullptr) : 0;
    if (size <= 0) {
      Refuse("holds a certificate that cannot be read");
    }
    std::vector<unsigned char> der(static_cast<std::size_t>(size));
    unsigned char* position = der.data();
    i2d_X509(x509.get(), &position);
    _certificates.push_back(MakeRef<CertificateImpl>(der));
  }

  void CountObject() {
    if (++_objects > kMaxPkcs12Objects) {
      Refuse("holds more than " + std::to_string(kMaxPkcs12Objects) + " objects");
    }
  }

  bool IsOfKey(const CertificateImpl& certificate) const {
    const bool matches = X509_check_private_key(certificate.GetX509(), _key->GetKey()) == 1;
    ClearOpenSslErrors();
    return matches;
  }

  Ref<const Certificate> TakeCertificateOfKey() {
    Ref<const Certificate> found;
    for (auto i = _certificates.begin(); i != _certificates.end();) {
      if (!IsOfKey(**i)) {
        ++i;
        continue;
      }
      if (found) {
        Refuse("holds more than one certificate of its private key");
      }
      found = *i;
      i = _certificates.erase(i);
    }
    if (!found) {
      Refuse("holds no certificate of its private key");
    }
    return found;
  }

  // A key belongs to a certificate by its public half, which its file repeats. A secret half that is damaged
  // shows only in what it signs, and one that is half damaged may give itself away by it (Boneh, DeMillo,
  // Lipton: faults in the Chinese remainders).
  void RequireWorkingKey(const Pkcs12Content& content) const {
    const char trial[] = "trial";
    const std::vector<unsigned char> value = content.privateKey->Sign(DIGEST_SHA256, trial, sizeof(trial));
    const std::vector<unsigned char> digest = ComputeDigest(DIGEST_SHA256, trial, sizeof(trial));
    if (!VerifySignatureValue(content.certificate.Get(), DIGEST_SHA256, digest, value)) {
      Refuse("holds a damaged private key");
    }
  }

  // Each is taken out as it is found, so that a self-signed one ends the search.
  std::list<Ref<const Certificate>> TakeIssuersOf(Ref<const CertificateImpl> subject) {
    std::list<Ref<const Certificate>> chain;
    for (auto i = _certificates.begin(); i != _certificates.end();) {
      if (!LooksLikeIssuer(**i, *subject)) {
        ++i;
        continue;
      }
      subject = *i;
      chain.push_back(subject);
      _certificates.erase(i);
      i = _certificates.begin();
    }
    return chain;
  }

  const char* _passPhrase;
  int _passPhraseSize;
  Pkcs12Profile _profile;
  std::size_t _objects = 0;
  Ref<const PrivateKeyImpl> _key;
  std::list<Ref<const CertificateImpl>> _certificates;
};

}  // namespace

Pkcs12Content ReadPkcs12(const std::vector<unsigned char>& der, const std::string& passPhrase) {
  if (passPhrase.size() > kMaxPkcs12PassPhraseBytes) {
    throw CryptoException("The pass phrase of the PKCS #12 file has more than " +
                          std::to_string(kMaxPkcs12PassPhraseBytes) + " bytes");
  }
  const FileHandle file = ParseFile(der);
  Reader reader(passPhrase);
  reader.Read(file.get());
  ClearOpenSslErrors();
  return reader.TakeContent();
}

}  // namespace Crypto
}  // namespace Pelmar
