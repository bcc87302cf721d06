// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// quorlin get-token: a valid token for scripts, from a file or from the service.

#include "quorlin/Acquisition.h"
#include "quorlin/Commands.h"
#include "quorlin/Failure.h"
#include "quorlin/Files.h"
#include "quorlin/Options.h"
#include "quorlin/Outcome.h"
#include "quorlin/Signals.h"
#include "quorlin/Terminal.h"
#include "quorlin/TokenCacheFile.h"

#include <pelmar/crypto/Digest.h>
#include <quorlin/SecurityTokenService.h>

#include <nlohmann/json.hpp>

#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <iostream>
#include <list>
#include <memory>
#include <optional>

namespace Cli {

namespace {

using TokenPointer = boost::shared_ptr<const Quorlin::SamlToken>;
using TrustList = std::list<Pelmar::Ref<const Pelmar::Crypto::Certificate>>;

constexpr long long kMicrosecondsPerSecond = 1000000;
/// Where a program that is run finds the token.
constexpr const char* kTokenVariable = "QUORLIN_TOKEN_FILE";
/// To tell a token whose time is over from one that never was good.
constexpr long long kAnyTimeSec = 100LL * 366 * 86400;

struct GetTokenArguments {
  Acquisition acquisition;
  bool byGss = false;
  std::string cacheFile;
  long long minLifeSec = 60;
  std::string program;
  std::vector<std::string> programArguments;
};

void CheckArguments(const GetTokenArguments& arguments) {
  const Acquisition& acquisition = arguments.acquisition;
  if (acquisition.userName.empty() && !arguments.byGss && acquisition.holderOfKey.key.empty() &&
      acquisition.holderOfKey.pkcs12File.empty()) {
    throw UsageException(
        "say how to get a token: with --user, with --gss, or with --cert and --key or --pkcs12");
  }
  const PasswordOptions& password = acquisition.password;
  if (acquisition.userName.empty() && (password.fromStdin || !password.file.empty())) {
    throw UsageException("--password-file and --password-stdin need --user");
  }
  const KerberosOptions& kerberos = acquisition.kerberos;
  if (!arguments.byGss && !(kerberos.target + kerberos.principal + kerberos.cache).empty()) {
    throw UsageException("--target, --principal and --ccache need --gss");
  }
  if (arguments.minLifeSec < 0 || arguments.minLifeSec >= acquisition.token.lifetimeSec) {
    throw UsageException("--min-life must be from 0 to less than --lifetime");
  }
}

std::string Digest(const std::string& text) {
  return Pelmar::Crypto::ToHex(
      Pelmar::Crypto::ComputeDigest(Pelmar::Crypto::DIGEST_SHA256, text.data(), text.size()));
}

std::string DigestFile(const std::string& path) {
  return path.empty() ? "" : Digest(ReadFile(path));
}

/// The digest of all that a token depends on. JSON keeps the parts apart. No secret is among them, and none
/// is asked for: a token that is kept needs no key.
std::string DigestPurpose(const GetTokenArguments& arguments) {
  const Acquisition& asked = arguments.acquisition;
  const auto parts = nlohmann::json::array(
      {asked.service.url, asked.userName, arguments.byGss, asked.kerberos.target, asked.kerberos.principal,
       asked.kerberos.cache, DigestFile(asked.holderOfKey.certificateFile),
       DigestFile(asked.holderOfKey.pkcs12File), asked.token.lifetimeSec, asked.token.renewable,
       asked.token.delegable, asked.token.delegateTo, asked.token.audience,
       DigestFile(asked.token.adviceFile), asked.token.bearer});
  // Bytes that are no UTF-8 are kept apart by nothing else, and refused by the request anyway.
  return Digest(parts.dump(-1, ' ', true, nlohmann::json::error_handler_t::replace));
}

long long GetLeftMicroseconds(const Quorlin::SamlToken& token) {
  return token.GetEndDate().GetUtcTime() - Pelmar::System::GetUtcDateTime().GetUtcTime();
}

bool HoldsLongEnough(const Quorlin::SamlToken& token, const GetTokenArguments& arguments) {
  return GetLeftMicroseconds(token) >= arguments.minLifeSec * kMicrosecondsPerSecond;
}

void Warn(const std::string& text) {
  std::cerr << "quorlin: warning: " << MakePrintable(text) << "\n";
}

/// What is wrong with the token, its time aside; empty when nothing is.
std::string FindFault(const std::string& xml, const TrustList& trusted) {
  try {
    Quorlin::CreateSamlToken(xml, trusted, kAnyTimeSec);
    return "";
  } catch (...) {
    return DescribeCurrentException(EXIT_REFUSED).message;
  }
}

/// The token of the cache if it is one that this run would ask for, and valid; null otherwise. `fault`
/// becomes what is wrong with it, its time aside.
TokenPointer FindToken(const TokenCacheFile& cache, const std::string& purpose, const TrustList& trusted,
                       std::string& fault) {
  const std::optional<CachedToken> cached = cache.Read();
  if (!cached || cached->purpose != purpose) {
    return nullptr;
  }
  fault = FindFault(cached->xml, trusted);
  if (!fault.empty()) {
    return nullptr;
  }
  try {
    return Quorlin::CreateSamlToken(cached->xml, trusted);
  } catch (const Quorlin::ParseException&) {
    return nullptr;  // Its time is over.
  }
}

TokenPointer Acquire(const GetTokenArguments& arguments) {
  if (!arguments.acquisition.userName.empty()) {
    return AcquireByPassword(arguments.acquisition);
  }
  return arguments.byGss ? AcquireByGss(arguments.acquisition) : AcquireByCertificate(arguments.acquisition);
}

/// Null when the token is none that can be renewed, or the service will not.
TokenPointer TryToRenew(const TokenPointer& old, const Acquisition& acquisition) {
  if (!old || !old->IsRenewable() ||
      old->GetConfirmationMethod() != Quorlin::SamlToken::CONFIRM_HOLDER_OF_KEY) {
    return nullptr;
  }
  const ServiceCall call(MakeServiceConfig(acquisition.service, acquisition.holderOfKey), acquisition.call);
  try {
    return call.Run([&](const Quorlin::SecurityTokenService& service) {
      return service.RenewToken(*old, acquisition.token.lifetimeSec);
    });
  } catch (const Quorlin::CommunicationException&) {
    throw;
  } catch (const Quorlin::SsoException&) {
    return nullptr;
  }
}

TokenPointer GetNewToken(const TokenPointer& old, const GetTokenArguments& arguments) {
  TokenPointer token = TryToRenew(old, arguments.acquisition);
  if (!token || !HoldsLongEnough(*token, arguments)) {
    token = Acquire(arguments);
  }
  if (!token) {
    throw Quorlin::SsoException("the service returned no token");
  }
  if (!HoldsLongEnough(*token, arguments)) {
    throw Quorlin::SsoException("the new token ends at " + token->GetEndDate().ToString() +
                                ", which is before --min-life");
  }
  return token;
}

/// A token whose cache says the same. One that is valid for a short while only is better than none.
TokenPointer ReplaceToken(const TokenPointer& old, const std::string& purpose,
                          const GetTokenArguments& arguments, const TokenCacheFile& cache) {
  try {
    const TokenPointer token = GetNewToken(old, arguments);
    cache.Replace({token->ToXml(), purpose});
    return token;
  } catch (...) {
    // Whoever ends the call by a signal wants nothing in the place of its result.
    EndByInterruption();
    if (!old || GetLeftMicroseconds(*old) <= 0) {
      throw;
    }
    Warn("there is no new token: " + DescribeCurrentException(EXIT_FAILED).message +
         "; the old one ends at " + old->GetEndDate().ToString());
    return old;
  }
}

TokenPointer GetToken(const GetTokenArguments& arguments) {
  const TrustList trusted = ReadCertificates(arguments.acquisition.service.stsCertificateFiles);
  const std::string purpose = DigestPurpose(arguments);
  TokenCacheFile cache(arguments.cacheFile);
  std::string fault;
  TokenPointer token = FindToken(cache, purpose, trusted, fault);
  if (token && HoldsLongEnough(*token, arguments)) {
    return token;
  }
  // Whoever held the lock before us may have got just what we need.
  cache.Lock();
  fault.clear();
  token = FindToken(cache, purpose, trusted, fault);
  if (token && HoldsLongEnough(*token, arguments)) {
    return token;
  }
  if (!fault.empty()) {
    Warn("the token in " + arguments.cacheFile + " is not used: " + fault);
  }
  return ReplaceToken(token, purpose, arguments, cache);
}

/// Becomes the program. Returns only by exception.
void RunProgram(const GetTokenArguments& arguments) {
  std::vector<std::string> words = {arguments.program};
  words.insert(words.end(), arguments.programArguments.begin(), arguments.programArguments.end());
  std::vector<char*> pointers;
  for (std::string& word : words) {
    pointers.push_back(word.data());
  }
  pointers.push_back(nullptr);
  const std::string path = std::filesystem::absolute(arguments.cacheFile).string();
  if (setenv(kTokenVariable, path.c_str(), 1) == 0) {
    execvp(pointers[0], pointers.data());
  }
  throw UsageException("cannot run " + arguments.program + ": " + std::strerror(errno));
}

void Run(const GetTokenArguments& arguments) {
  CheckArguments(arguments);
  const TokenPointer token = GetToken(arguments);
  EndByInterruption();
  if (!arguments.program.empty()) {
    RunProgram(arguments);
  }
  Print(token->ToXml() + "\n");
}

void AddWays(CLI::App& command, GetTokenArguments& arguments) {
  CLI::Option* const user =
      command.add_option("--user", arguments.acquisition.userName, "Get it for this user, by password")
          ->type_name("NAME");
  AddPasswordOptions(command, arguments.acquisition.password);
  command.add_flag("--gss", arguments.byGss, "Get it for the owner of a Kerberos ticket")->excludes(user);
  AddKerberosOptions(command, arguments.acquisition.kerberos);
}

}  // namespace

Command AddGetTokenCommand(CLI::App& app) {
  const auto arguments = std::make_shared<GetTokenArguments>();
  CLI::App* const command =
      app.add_subcommand("get-token", "Print a valid token: from a file, or a new one when need be");
  command->add_option("--cache", arguments->cacheFile, "Keep the token in this file, which only you may use")
      ->required()
      ->type_name("FILE");
  command
      ->add_option("--min-life", arguments->minLifeSec,
                   "For how long the token shall still be valid, in seconds")
      ->type_name("SEC")
      ->capture_default_str();
  CLI::Option* const program =
      command->add_option("--exec", arguments->program, "Run this program instead of printing the token")
          ->type_name("CMD");
  command
      ->add_option("arguments", arguments->programArguments,
                   "What the program is given; what begins with a dash stands after --")
      ->needs(program);
  AddServiceOptions(*command, arguments->acquisition.service);
  AddCallOptions(*command, arguments->acquisition.call);
  AddWays(*command, *arguments);
  AddHolderOfKeyOptions(*command, arguments->acquisition.holderOfKey, false);
  AddTokenOptions(*command, arguments->acquisition.token);
  AddBearerOption(*command, arguments->acquisition.token);
  AddLogOption(*command);
  command->footer(
      "The token is got by --user, by --gss, or else by --cert and --key or --pkcs12; a renewable one that is bound to your key is\n"
      "renewed. The program of --exec finds the name of the token's file in the variable QUORLIN_TOKEN_FILE.\n\n"
      "Examples:\n"
      "  quorlin get-token --cache ~/.cache/files.xml --url https://sts.example.com/sts --sts-cert sts.pem \\\n"
      "      --user alice@example.com --password-file secret.txt\n"
      "  quorlin get-token --cache ~/.cache/files.xml --url https://sts.example.com/sts --sts-cert sts.pem \\\n"
      "      --cert me.pem --key me.key --renewable --exec upload -- --all report.txt");
  return {command, [arguments] {
            return RunReporting([&] { Run(*arguments); });
          }};
}

}  // namespace Cli
