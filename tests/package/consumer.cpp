// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors
//
// What a host application does first: includes the one header, calls the library, and catches an exception of its classes
// across the library's boundary.

#include <quorlin/quorlin.h>

#include <iostream>

int main() {
  try {
    Quorlin::CreateSamlToken("<notAnAssertion/>", static_cast<const Pelmar::Crypto::Certificate*>(nullptr));
  } catch (const Quorlin::ParseException& refusal) {
    std::cout << "refused: " << refusal.what() << '\n';
    return 0;
  } catch (const std::exception& error) {
    std::cerr << "an exception of another class: " << error.what() << '\n';
    return 1;
  }
  std::cerr << "accepted what is not a token\n";
  return 1;
}
