// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Made by tests/vectors/tokens/make.py.

#ifndef QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H
#define QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H

/// The certificate of the key that signed the seeds.
constexpr const char* kTrustedCertificate =
    "-----BEGIN CERTIFICATE-----\n"
    "MIIC3zCCAcegAwIBAgIBATANBgkqhkiG9w0BAQsFADAYMRYwFAYDVQQDDA1Ub2tl\n"
    "biB2ZWN0b3JzMCAXDTAwMDEwMTAwMDAwMFoYDzk5OTkxMjMxMjM1OTU5WjAYMRYw\n"
    "FAYDVQQDDA1Ub2tlbiB2ZWN0b3JzMIIBIjANBgkqhkiG9w0BAQEFAAOCAQ8AMIIB\n"
    "CgKCAQEAwPhmZtl/4PHX9iLvpo8VSy1qAyfZxknVF45J9BkJ+DDlm3cCET/m/tud\n"
    "nVk+0jBMksPLIp3x8/5hCoH9uBBdq8QlE5IbtNQBYkx6m5L4h232k6ZrqaHL7V6k\n"
    "JhFJRWim6NQAtJG358Qp+1/tVnPGrCmnBfg5w+nTUH+b9DCwT8KlHy1yPDgkGVnG\n"
    "uXaG7xQnto5akcdoKyqmL7m/P7H3C5rCqQkQywn/0fj0+mzAlR+m3aEAhPLrrSqh\n"
    "ZyVbjCISWdNxuUol7gvsnso4Piv7pErBBfQkFxCuXqGoNnZZ4SJVo802KJBU0wpO\n"
    "kHP/T2RMTYP0X0/RT2sSRou2iYmUIQIDAQABozIwMDAPBgNVHRMBAf8EBTADAQH/\n"
    "MB0GA1UdDgQWBBQKm4c6xKGPrWDisi4az7wFV7di7DANBgkqhkiG9w0BAQsFAAOC\n"
    "AQEAAJc64zZfgjnFDth8Zlph0xkMR+T7h/fEAF7eiaJaKkPPH8lLGvXJhbX2+mRP\n"
    "pF2OXIkRY0D1OKxAg7qoT1NrNXmbLECWKahG9oLulBQzKRNgr0J1wUS6u2mVoy12\n"
    "9Spaec7XB5eJl9BbVSe8x2QCMOuoPMN5IxrxKF9Dv2qdTE1UPUd6+g13/5OFihAX\n"
    "JjlMHKOA29yZFcEK103o46hH9hJLTnHQ9mDq8fxcA8C5N0iuhK7NZmAH2SklqMYc\n"
    "PG0wPJb1S5J7d4/BXSNrKE6KZ+Hwm7Zgps+psPnVD1zq58Z8Unrjyv69x1ZEH210\n"
    "GgwgLQxYH2CzujBtpiLWJU/WJw==\n"
    "-----END CERTIFICATE-----\n";

/// All that this key ever signed.
constexpr const char* kOriginalMeanings[] = {
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:58Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "renewable 0, delegable 0, solution 0, confirmation 0\n"
    "certificate none\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {Al\303\257ce}{Liddell}\n"
    "renewable 0, delegable 0, solution 0, confirmation 0\n"
    "certificate none\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "delegate {proxy1}{example.com} 2020-01-01T00:00:00Z\n"
    "delegate {proxy2}{example.com} 2020-06-01T10:00:00.25Z\n"
    "renewable 0, delegable 0, solution 0, confirmation 0\n"
    "certificate none\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "renewable 0, delegable 0, solution 0, confirmation 0\n"
    "audience {urn:a}\n"
    "audience {urn:b}\n"
    "certificate none\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "renewable 0, delegable 0, solution 0, confirmation 0\n"
    "certificate none\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "renewable 0, delegable 0, solution 0, confirmation 1\n"
    "certificate b925e8842f2fa38be2589f88b5fca097386fb8ade7f96c02d317d6315c9408ca\n",
    "id {_5f3d}\n"
    "from 2020-01-01T00:00:00Z until 9999-12-31T23:59:59Z\n"
    "subject {alice}{example.com}\n"
    "name {}{}\n"
    "renewable 0, delegable 1, solution 0, confirmation 0\n"
    "certificate none\n"};

#endif  // QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H
