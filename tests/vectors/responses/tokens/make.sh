#!/bin/sh
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Makes the tokens of this folder anew, with a key that is thrown away: signer.pem (openssl), valid.xml, expired.xml (xmlsec1) and
# tampered.xml, which is valid.xml with another subject.
set -eu
cd "$(dirname "$0")"
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Valid from long ago until the end of time, so that no test depends on the day. Only "openssl ca" can set both dates.
cat > "$work/ca.cnf" <<EOF
[ca]
default_ca = signer
[signer]
database = $work/index
serial = $work/serial
new_certs_dir = $work
default_md = sha256
policy = any
x509_extensions = extensions
[any]
organizationName = supplied
commonName = supplied
[extensions]
basicConstraints = critical,CA:TRUE
subjectKeyIdentifier = hash
EOF
: > "$work/index"
echo 01 > "$work/serial"
openssl req -new -newkey rsa:2048 -sha256 -nodes -subj "/O=Quorlin test data/CN=Token signer" \
  -keyout "$work/key.pem" -out "$work/request.pem" 2>/dev/null
openssl ca -config "$work/ca.cnf" -batch -notext -selfsign -keyfile "$work/key.pem" -in "$work/request.pem" \
  -startdate 20000101000000Z -enddate 99991231235959Z -out signer.pem 2>/dev/null

# assertion ID NOT_BEFORE NOT_ON_OR_AFTER
assertion() {
  cat <<EOF
<saml:Assertion xmlns:saml="urn:oasis:names:tc:SAML:2.0:assertion" ID="$1" IssueInstant="$2" Version="2.0"><saml:Issuer Format="urn:oasis:names:tc:SAML:2.0:nameid-format:entity">https://sts.example/</saml:Issuer><ds:Signature xmlns:ds="http://www.w3.org/2000/09/xmldsig#"><ds:SignedInfo><ds:CanonicalizationMethod Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/><ds:SignatureMethod Algorithm="http://www.w3.org/2001/04/xmldsig-more#rsa-sha256"/><ds:Reference URI="#$1"><ds:Transforms><ds:Transform Algorithm="http://www.w3.org/2000/09/xmldsig#enveloped-signature"/><ds:Transform Algorithm="http://www.w3.org/2001/10/xml-exc-c14n#"/></ds:Transforms><ds:DigestMethod Algorithm="http://www.w3.org/2001/04/xmlenc#sha256"/><ds:DigestValue/></ds:Reference></ds:SignedInfo><ds:SignatureValue/><ds:KeyInfo><ds:X509Data><ds:X509Certificate/></ds:X509Data></ds:KeyInfo></ds:Signature><saml:Subject><saml:NameID Format="http://schemas.xmlsoap.org/claims/UPN">alice@example.com</saml:NameID><saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer"><saml:SubjectConfirmationData NotOnOrAfter="$3"/></saml:SubjectConfirmation></saml:Subject><saml:Conditions NotBefore="$2" NotOnOrAfter="$3"><saml:ProxyRestriction Count="1"/></saml:Conditions><saml:AuthnStatement AuthnInstant="$2"><saml:AuthnContext><saml:AuthnContextClassRef>urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport</saml:AuthnContextClassRef></saml:AuthnContext></saml:AuthnStatement></saml:Assertion>
EOF
}

# sign FILE: signs the assertion on standard input; the XML declaration that xmlsec1 writes is left out.
sign() {
  cat > "$work/unsigned.xml"
  xmlsec1 --sign --id-attr:ID urn:oasis:names:tc:SAML:2.0:assertion:Assertion \
    --privkey-pem "$work/key.pem,signer.pem" "$work/unsigned.xml" | sed '/^<?xml/d' > "$1"
}

assertion _7f5a64e2 2020-01-01T00:00:00Z 9999-12-31T23:59:59Z | sign valid.xml
assertion _0b1c2d3e 2020-01-01T00:00:00Z 2020-01-02T00:00:00Z | sign expired.xml
sed 's/alice@example\.com/mallory@example.com/' valid.xml > tampered.xml
