// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// OpenSSL 3.0 deprecates engines in favour of providers; the systems we build on have the engine only.
#define OPENSSL_SUPPRESS_DEPRECATED

#include "pelmar/crypto/Pkcs11Engine.h"

#include "pelmar/crypto/OpenSslError.h"
#include "pelmar/crypto/Pin.h"

#include <pelmar/crypto/CryptoException.h>

#include <openssl/opensslconf.h>

#ifndef OPENSSL_NO_ENGINE
#include <openssl/engine.h>
#include <openssl/err.h>
#include <openssl/ui.h>

#include <dlfcn.h>

#include <mutex>
#endif

namespace Pelmar {
namespace Crypto {

namespace {

thread_local PinOnDemand* currentPin = nullptr;

#ifndef OPENSSL_NO_ENGINE

// --- What the engine asks ---

// Without a reader of ours OpenSSL would ask on the terminal.
int AnswerQuestion(UI* ui, UI_STRING* question) {
  PinOnDemand* const pin = PinOnDemand::GetCurrent();
  if (pin == nullptr) {
    return 0;
  }
  try {
    return UI_set_result(ui, question, Pin(pin->askPin).Get()) == 0 ? 1 : 0;
  } catch (...) {
    pin->failure = std::current_exception();
    return 0;
  }
}

/// Lives as long as the process: keys keep pointing to it.
UI_METHOD* GetPinMethod() {
  static UI_METHOD* const method = [] {
    UI_METHOD* const made = UI_create_method("PelmarPin");
    if (made == nullptr || UI_method_set_reader(made, AnswerQuestion) != 0) {
      ThrowOpenSslError("The PKCS #11 engine cannot be started");
    }
    return made;
  }();
  return method;
}

// --- The engine ---

/// The process's engine. There is one, because OpenSSL loads it once, and it has one module, because a second
/// engine over the same module would end the first one's sessions with its own. It is never freed: a key
/// may outlive everything else.
class Pkcs11Engine final {
 public:
  static Pkcs11Engine& Get() {
    static auto* const engine = new Pkcs11Engine();
    return *engine;
  }

  EVP_PKEY* Load(const std::string& objectUri, const std::string& modulePath, const char* pin) {
    const std::lock_guard<std::mutex> lock(_mutex);
    ClearOpenSslErrors();
    UseModule(modulePath);
    // The engine keeps the PIN of the key before, and would try it on this token: with a few keys that locks
    // a token. So each load brings its own.
    if (ENGINE_ctrl_cmd_string(_engine, "PIN", pin, 0) != 1) {
      ThrowOpenSslError("The PKCS #11 engine does not take a PIN");
    }
    EVP_PKEY* const key = ENGINE_load_private_key(_engine, objectUri.c_str(), GetPinMethod(), nullptr);
    if (key == nullptr) {
      ThrowOpenSslError("The PKCS #11 key cannot be loaded");
    }
    ClearOpenSslErrors();
    return key;
  }

 private:
  Pkcs11Engine() = default;

  void UseModule(const std::string& modulePath) {
    if (!_modulePath.empty()) {
      RequireSameModule(modulePath);
      return;
    }
    RequireModule(modulePath);
    if (_engine == nullptr) {
      _engine = LoadEngine();
    }
    StartEngine(modulePath);
    _modulePath = modulePath;
  }

  void RequireSameModule(const std::string& modulePath) const {
    if (modulePath != _modulePath) {
      throw CryptoException("The PKCS #11 module '" + modulePath + "' cannot be used: this process uses '" +
                            _modulePath + "' already");
    }
  }

  // The engine's own message would go to standard error. The handle is kept: the engine is about to load the
  // same file, and modules do not like to be unloaded.
  static void RequireModule(const std::string& modulePath) {
    void* const module = dlopen(modulePath.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
      throw CryptoException(std::string("The PKCS #11 module cannot be loaded: ") + dlerror());
    }
    if (dlsym(module, "C_GetFunctionList") == nullptr) {
      dlclose(module);
      throw CryptoException("The PKCS #11 module '" + modulePath +
                            "' cannot be used: it is no PKCS #11 module");
    }
  }

  // By the path that OpenSSL was built with: ENGINE_by_id would let the environment name another.
  static ENGINE* LoadEngine() {
    ENGINE* const engine = ENGINE_by_id("dynamic");
    if (engine == nullptr || ENGINE_ctrl_cmd_string(engine, "ID", "pkcs11", 0) != 1 ||
        ENGINE_ctrl_cmd_string(engine, "DIR_LOAD", "2", 0) != 1 ||
        ENGINE_ctrl_cmd_string(engine, "DIR_ADD", OPENSSL_info(OPENSSL_INFO_ENGINES_DIR), 0) != 1 ||
        ENGINE_ctrl_cmd_string(engine, "LIST_ADD", "0", 0) != 1) {
      ENGINE_free(engine);
      ThrowOpenSslError("The PKCS #11 engine cannot be started");
    }
    if (ENGINE_ctrl_cmd_string(engine, "LOAD", nullptr, 0) != 1) {
      const bool isMissing = ERR_GET_REASON(ERR_peek_last_error()) == ENGINE_R_DSO_NOT_FOUND;
      ENGINE_free(engine);
      ThrowLoadError(isMissing);
    }
    return engine;
  }

  [[noreturn]] static void ThrowLoadError(bool isMissing) {
    if (isMissing) {
      ClearOpenSslErrors();
      throw CryptoException(
          "OpenSSL's PKCS #11 engine is not installed (on Debian: libengine-pkcs11-openssl)");
    }
    ThrowOpenSslError("The PKCS #11 engine cannot be started; does another part of the process use it?");
  }

  void StartEngine(const std::string& modulePath) {
    if (ENGINE_ctrl_cmd_string(_engine, "MODULE_PATH", modulePath.c_str(), 0) != 1 ||
        // Messages are ours to write.
        ENGINE_ctrl_cmd_string(_engine, "QUIET", nullptr, 0) != 1 ||
        ENGINE_ctrl_cmd(_engine, "SET_USER_INTERFACE", 0, GetPinMethod(), nullptr, 0) != 1 ||
        ENGINE_init(_engine) != 1) {
      ThrowOpenSslError("The PKCS #11 engine cannot be started");
    }
  }

  std::mutex _mutex;
  ENGINE* _engine = nullptr;
  std::string _modulePath;  ///< Empty until the engine has been started with it.
};

#endif

}  // namespace

PinOnDemand::PinOnDemand(const PinFunction& ask) : askPin(ask), _outer(currentPin) {
  currentPin = this;
}

PinOnDemand::~PinOnDemand() {
  currentPin = _outer;
}

void PinOnDemand::RethrowFailure() const {
  if (failure) {
    std::rethrow_exception(failure);
  }
}

PinOnDemand* PinOnDemand::GetCurrent() {
  return currentPin;
}

evp_pkey_st* LoadPkcs11Key(const std::string& objectUri, const std::string& modulePath, const char* pin) {
#ifndef OPENSSL_NO_ENGINE
  return Pkcs11Engine::Get().Load(objectUri, modulePath, pin);
#else
  static_cast<void>(objectUri);
  static_cast<void>(modulePath);
  static_cast<void>(pin);
  throw CryptoException("This OpenSSL was built without engines, so PKCS #11 keys cannot be used");
#endif
}

}  // namespace Crypto
}  // namespace Pelmar
