// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// A validly signed token is edited as the input says: parts are changed, moved, copied, wrapped and dropped,
// names and namespaces altered, and it is signed anew, or not, by the right key or a wrong one. Then
// - what is accepted has, but for the signature, the very content that a right key signed (before or in
//   between), and means what the table of TokenProfile.h says that this content means;
// - what a right key signed as it stands, and the table accepts, is accepted.

#include "TokenEdits.h"
#include "TokenProfile.h"
#include "TokenSigner.h"
#include "TokenTree.h"

#include "../tests/support/TokenMeaning.h"

#include <pelmar/Exception.h>
#include <pelmar/crypto/Certificate.h>
#include <pelmar/crypto/Digest.h>
#include <quorlin/Exceptions.h>
#include <quorlin/SamlToken.h>

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <list>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace TokenFuzz;

using TrustList = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

/// What a right key signed.
struct Snapshot {
  std::string content;                 ///< Of the assertion, without its signature.
  std::optional<std::string> meaning;  ///< None when the profile refuses it.
  std::string document;                ///< All of the document, without that signature.
  std::string signature;               ///< The signature's text.
  bool isPlain;                        ///< Signs nothing but the assertion.
};

const std::vector<Holder>& Holders() {
  static const std::vector<Holder> holders = [] {
    const Pelmar::Ref<const Pelmar::Crypto::Certificate> leaf =
        Pelmar::Crypto::CreateCertificateFromPem(kLeafCertificatePem);
    return std::vector<Holder>{
        {SignerDetail::CertificateText(kLeafCertificatePem), Pelmar::Crypto::ToHex(leaf->GetSha256())}};
  }();
  return holders;
}

const TrustList& Trusted() {
  static const TrustList trusted = {Pelmar::Crypto::CreateCertificateFromPem(kFuzzCertificatePem),
                                    Pelmar::Crypto::CreateCertificateFromPem(kAuthorityCertificatePem)};
  return trusted;
}

bool IsAssertion(const TreeNode& node) {
  return node.kind == Kind::ELEMENT && LocalOf(node.name) == "Assertion";
}

/// The namespaces in scope around a node of the tree.
bool FindScope(const TreeNode& node, const TreeNode* wanted, const Scope& around, Scope& found) {
  if (&node == wanted) {
    found = around;
    return true;
  }
  const Scope scope = node.kind == Kind::ELEMENT ? ScopeWithin(node, around) : around;
  for (const TreeNode& child : node.children) {
    if (FindScope(child, wanted, scope, found)) {
      return true;
    }
  }
  return false;
}

Scope ScopeAround(const TreeNode& document, const TreeNode& element) {
  Scope scope;
  FindScope(document, &element, OuterScope(), scope);
  return scope;
}

/// The second child that counts: there the reader looks for the signature.
const TreeNode* FindSignature(const TreeNode& assertion) {
  std::size_t seen = 0;
  for (const TreeNode& child : assertion.children) {
    const bool counts = child.kind != Kind::COMMENT && !(IsText(child) && ProfileDetail::IsBlank(child.text));
    seen += counts ? 1 : 0;
    if (counts && seen == 2) {
      return &child;
    }
  }
  return nullptr;
}

bool MayBeId(const std::string& name) {
  const std::string local = ProfileDetail::ToLower(LocalOf(name));
  return local == "id" && PrefixOf(name) != "xmlns";
}

/// How many attributes could be taken for this ID.
std::size_t CountIds(const TreeNode& node, const std::string& id) {
  std::size_t count = 0;
  for (const auto& attribute : node.attributes) {
    count += attribute.second == id && MayBeId(attribute.first) ? 1u : 0u;
  }
  for (const TreeNode& child : node.children) {
    count += CountIds(child, id);
  }
  return count;
}

std::string WithoutWhiteSpace(std::string text) {
  text.erase(
      std::remove_if(text.begin(), text.end(), [](char c) { return std::strchr(" \t\r\n", c) != nullptr; }),
      text.end());
  return text;
}

// --- The run ---

class Run final {
 public:
  Run(const std::uint8_t* data, std::size_t size) : _document(), _data(data), _size(size) {
    _document.kind = Kind::DOCUMENT;
  }

  void Do() {
    Begin(_size == 0 ? std::uint8_t{0} : _data[0]);
    Editor editor(_document, _document.children.front());
    for (std::size_t i = 0; i < kMaxEdits && 1 + (i + 1) * kEditBytes <= _size; ++i) {
      Edit edit{};
      std::memcpy(edit.data(), _data + 1 + i * kEditBytes, kEditBytes);
      const Act act = static_cast<Act>(edit[0] % static_cast<std::uint8_t>(Act::COUNT));
      if (act == Act::SIGN) {
        SignAgain(edit);
      } else if (CountNodes(_document) < kMaxTreeNodes) {
        editor.Apply(act, edit);
      }
    }
    JudgeAll();
  }

 private:
  // Signed once for all runs.
  void Begin(std::uint8_t kind) {
    static std::map<unsigned, std::pair<TreeNode, Snapshot>> known;
    const unsigned number = kind % kAssertionKinds;
    const auto found = known.find(number);
    if (found != known.end()) {
      _document = found->second.first;
      _snapshots.push_back(found->second.second);
      return;
    }
    _document.children = {MakeAssertion(kind)};
    if (!Sign(_document.children.front(), 1, Signing()) || !_snapshots.front().meaning) {
      Fail("a token is signed to begin with");
    }
    known.emplace(number, std::make_pair(_document, _snapshots.front()));
  }

  void SignAgain(const Edit& edit) {
    const std::vector<Place> places = FindPlaces(_document, IsAssertion);
    if (places.empty() || !IsWellFormed(_document, OuterScope())) {
      return;
    }
    TreeNode& assertion = places[edit[1] % places.size()].Get();
    Signing signing = ReadSigning(edit);
    signing.elsewhere = FindOtherId(assertion);
    std::vector<TreeNode>& children = assertion.children;
    if ((edit[5] & 8) == 0) {
      children.erase(std::remove_if(children.begin(), children.end(),
                                    [](const TreeNode& child) { return LocalOf(child.name) == "Signature"; }),
                     children.end());
    }
    const std::size_t places3[] = {AfterFirstElement(assertion), AfterFirstElement(assertion), 0,
                                   children.size()};
    Sign(assertion, places3[(edit[5] / 16) % 4], signing);
  }

  static std::size_t AfterFirstElement(const TreeNode& assertion) {
    std::size_t at = 0;
    while (at < assertion.children.size() && assertion.children[at].kind != Kind::ELEMENT) {
      ++at;
    }
    return std::min(at + 1, assertion.children.size());
  }

  std::string FindOtherId(const TreeNode& assertion) {
    std::string other = "_9";
    for (const Place& place : FindPlaces(_document, IsElement)) {
      const std::string* const id = FindAttribute(place.Get(), "ID");
      if (id != nullptr && !id->empty() && &place.Get() != &assertion) {
        other = *id;
      }
    }
    return other;
  }

  bool Sign(TreeNode& assertion, std::size_t index, const Signing& signing) {
    if (!SignTree(_document, assertion, index, signing)) {
      return false;
    }
    if (signing.IsRight()) {
      const TreeNode& signature = assertion.children[index];
      const Scope around = ScopeAround(_document, assertion);
      const bool isPlain = signing.cover == Cover::BY_ID || signing.cover == Cover::WHOLE_DOCUMENT;
      _snapshots.push_back(Snapshot{Describe(assertion, around, &signature, Look::SIGNED),
                                    JudgeByProfile(assertion, around, Holders()).meaning,
                                    Describe(_document, OuterScope(), &signature, Look::STRICT),
                                    Write(signature), isPlain});
    }
    return true;
  }

  void JudgeAll() {
    const std::string text = Write(_document);
    const TreeNode* root = nullptr;
    for (const TreeNode& child : _document.children) {
      root = child.kind == Kind::ELEMENT ? &child : root;
    }
    Compare(*root, Judge([&text] { return Quorlin::CreateSamlToken(text, Trusted()); }));
    Pelmar::Ref<Pelmar::Xml::Document> document;
    try {
      document = SignerDetail::Parse(text);
    } catch (const Pelmar::Exception&) {
      return;
    }
    std::vector<Pelmar::Xml::ElementNode*> elements;
    CollectAssertions(document->GetFirstChild(), elements);
    const std::vector<Place> places = FindPlaces(_document, IsAssertion);
    if (elements.size() != places.size()) {
      Fail("both trees hold the same assertions");
    }
    for (std::size_t i = 0; i < elements.size() && i < kMaxJudged; ++i) {
      Compare(places[i].Get(),
              Judge([&] { return Quorlin::CreateSamlTokenFromDom(elements[i], Trusted()); }));
    }
  }

  static void CollectAssertions(Pelmar::Xml::Node* node, std::vector<Pelmar::Xml::ElementNode*>& elements) {
    for (; node != nullptr; node = node->GetNextSibling()) {
      Pelmar::Xml::ElementNode* const element = Pelmar::Xml::AsElement(node);
      if (element == nullptr) {
        continue;
      }
      if (element->GetLocalName() == "Assertion") {
        elements.push_back(element);
      }
      CollectAssertions(element->GetFirstChild(), elements);
    }
  }

  /// What the token means; none when it is refused.
  template <typename Create>
  std::optional<std::string> Judge(Create create) {
    try {
      return TestSupport::MeaningOf(*create());
    } catch (const Pelmar::Exception& error) {
      _reason = error.what();
    } catch (Quorlin::ParseException* error) {
      _reason = error->what();
      delete error;
    }
    return std::nullopt;
  }

  void Compare(const TreeNode& element, const std::optional<std::string>& meaning) {
    const Scope around = ScopeAround(_document, element);
    const Judgement profile = JudgeByProfile(element, around, Holders());
    const TreeNode* const signature = FindSignature(element);
    if (meaning) {
      CheckAccepted(*meaning, profile, Describe(element, around, signature, Look::SIGNED));
    } else if (signature != nullptr && profile.meaning && profile.isCertain &&
               IsSignedAsItStands(element, *signature)) {
      Fail("a token of the profile that a right key signed as it stands is accepted");
    }
  }

  void CheckAccepted(const std::string& meaning, const Judgement& profile, const std::string& content) const {
    if (profile.isCertain && profile.meaning != meaning) {
      Fail("an accepted token is of the profile and means what it says");
    }
    bool wasSigned = false;
    for (const Snapshot& snapshot : _snapshots) {
      // A comment beside a text may take white space at the text's end out of the value.
      wasSigned = wasSigned ||
                  (snapshot.content == content &&
                   (!snapshot.meaning || WithoutWhiteSpace(*snapshot.meaning) == WithoutWhiteSpace(meaning)));
    }
    if (!wasSigned) {
      Fail("an accepted token has the content that a right key signed");
    }
  }

  bool IsSignedAsItStands(const TreeNode& element, const TreeNode& signature) const {
    const std::string* const id = FindAttribute(element, "ID");
    if (id == nullptr || CountIds(_document, *id) != 1 || !IsWellFormed(_document, OuterScope())) {
      return false;
    }
    const std::string document = Describe(_document, OuterScope(), &signature, Look::STRICT);
    const std::string text = Write(signature);
    return std::any_of(_snapshots.begin(), _snapshots.end(), [&](const Snapshot& snapshot) {
      return snapshot.isPlain && snapshot.document == document && snapshot.signature == text;
    });
  }

  [[noreturn]] void Fail(const char* promise) const {
    std::cerr << "broken: " << promise << "\nlast refusal: " << _reason << "\n"
              << Write(_document) << std::endl;
    std::abort();
  }

  static constexpr std::size_t kMaxJudged = 3;

  TreeNode _document;
  const std::uint8_t* const _data;
  const std::size_t _size;
  std::vector<Snapshot> _snapshots;
  std::string _reason;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Run(data, size).Do();
  return 0;
}

#ifdef QUORLIN_LIBFUZZER

extern "C" std::size_t LLVMFuzzerMutate(std::uint8_t* data, std::size_t size, std::size_t maxSize);

// Whole edits are doubled, dropped and exchanged, so that those around them keep their meaning; within an
// edit bytes change.
extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size, std::size_t maxSize,
                                               unsigned int seed) {
  constexpr std::size_t kLargest = 1 + kMaxEdits * kEditBytes;
  const std::size_t room = std::min(maxSize, kLargest);
  if (size < 1 + kEditBytes || (size - 1) % kEditBytes != 0 || size > room) {
    const std::size_t mutated = LLVMFuzzerMutate(data, std::min(size, room), room);
    return mutated < 1 + kEditBytes ? mutated : mutated - (mutated - 1) % kEditBytes;
  }
  const std::size_t count = (size - 1) / kEditBytes;
  std::uint8_t* const one = data + 1 + (seed / 8) % count * kEditBytes;
  std::uint8_t* const end = data + size;
  switch (seed % 8) {
    case 0:
      if (size + kEditBytes <= room) {
        std::memmove(one + kEditBytes, one, static_cast<std::size_t>(end - one));
        LLVMFuzzerMutate(one, kEditBytes, kEditBytes);
        return size + kEditBytes;
      }
      break;
    case 1:
      std::memmove(one, one + kEditBytes, static_cast<std::size_t>(end - one) - kEditBytes);
      return size - kEditBytes;
    case 2:
      std::swap_ranges(one, one + kEditBytes, data + 1 + (seed / 4096) % count * kEditBytes);
      return size;
    case 3:
      return LLVMFuzzerMutate(data, size, size);
    default:
      break;
  }
  const std::size_t changed = LLVMFuzzerMutate(one, kEditBytes, kEditBytes);
  std::memset(one + changed, 0, kEditBytes - changed);
  return size;
}

#endif
