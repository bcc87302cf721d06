#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Makes the tokens of this folder anew: accept/*.xml (signed by xmlsec1), reject/*.xml and both expected.txt; and from these the seeds
of the fuzz target for tokens with the header that tells it what was signed.

The key is ../keys/tokenSigner.pem; signer.pem is its certificate, valid from 2000 to 9999 (openssl). What is expected of each token is
written here by hand, beside what makes the token special; nothing is asked of the library.
"""

import base64
import hashlib
import os
import subprocess
import tempfile

HERE = os.path.dirname(os.path.abspath(__file__))
KEY = os.path.join(HERE, "..", "keys", "tokenSigner.pem")
CERTIFICATE = os.path.join(HERE, "signer.pem")
FUZZ = os.path.join(HERE, "..", "..", "..", "fuzz")

SAML = "urn:oasis:names:tc:SAML:2.0:assertion"
XSI = "http://www.w3.org/2001/XMLSchema-instance"
DELEGATION = "urn:oasis:names:tc:SAML:2.0:conditions:delegation"
EXC = "http://www.w3.org/2001/10/xml-exc-c14n#"
C14N = "http://www.w3.org/TR/2001/REC-xml-c14n-20010315"
UPN = "http://schemas.xmlsoap.org/claims/UPN"
CLAIMS = "http://schemas.xmlsoap.org/ws/2005/05/identity/claims/"
RSA = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha"
SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256"
START = "2020-01-01T00:00:00Z"
END = "9999-12-31T23:59:59Z"

CA_CONFIGURATION = """[ca]
default_ca = signer
[signer]
database = {0}/index
serial = {0}/serial
new_certs_dir = {0}
default_md = sha256
policy = any
x509_extensions = extensions
[any]
commonName = supplied
[extensions]
basicConstraints = critical,CA:TRUE
subjectKeyIdentifier = hash
"""


def write(path, text):
    with open(path, "wb") as file:
        file.write(text if isinstance(text, bytes) else text.encode())


def make_certificate():
    with tempfile.TemporaryDirectory() as work:
        write(f"{work}/ca.cnf", CA_CONFIGURATION.format(work))
        write(f"{work}/index", "")
        write(f"{work}/serial", "01\n")
        subprocess.run(["openssl", "req", "-new", "-sha256", "-key", KEY, "-subj", "/CN=Token vectors",
                        "-out", f"{work}/request.pem"], check=True)
        subprocess.run(["openssl", "ca", "-config", f"{work}/ca.cnf", "-batch", "-notext", "-selfsign", "-keyfile", KEY,
                        "-in", f"{work}/request.pem", "-startdate", "20000101000000Z", "-enddate", "99991231235959Z",
                        "-out", CERTIFICATE], check=True, stderr=subprocess.DEVNULL)


def sign(text):
    with tempfile.TemporaryDirectory() as work:
        write(f"{work}/unsigned.xml", text)
        signed = subprocess.run(["xmlsec1", "--sign", "--id-attr:ID", SAML + ":Assertion", "--privkey-pem",
                                 f"{KEY},{CERTIFICATE}", f"{work}/unsigned.xml"], check=True, stdout=subprocess.PIPE).stdout
    # Without the XML declaration and the line end that xmlsec1 adds.
    return signed.decode().split("\n", 1)[1].rstrip("\n")


def signature(uri="#_5f3d", transforms=None, canonicalization=f'Algorithm="{EXC}"', method=RSA + "256", digest=SHA256):
    if transforms is None:
        transforms = f'<ds:Transform Algorithm="{EXC}"/>'
    return (f'<ds:Signature xmlns:ds="http://www.w3.org/2000/09/xmldsig#"><ds:SignedInfo>'
            f'<ds:CanonicalizationMethod {canonicalization}/><ds:SignatureMethod Algorithm="{method}"/>'
            f'<ds:Reference URI="{uri}"><ds:Transforms>'
            f'<ds:Transform Algorithm="http://www.w3.org/2000/09/xmldsig#enveloped-signature"/>{transforms}</ds:Transforms>'
            f'<ds:DigestMethod Algorithm="{digest}"/><ds:DigestValue/></ds:Reference></ds:SignedInfo><ds:SignatureValue/>'
            f'<ds:KeyInfo><ds:X509Data><ds:X509Certificate/></ds:X509Data></ds:KeyInfo></ds:Signature>')


ISSUER = '<saml:Issuer Format="urn:oasis:names:tc:SAML:2.0:nameid-format:entity">https://sts.example/</saml:Issuer>'
NAME = f'<saml:NameID Format="{UPN}">alice@example.com</saml:NameID>'
BEARER = (f'<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:bearer">'
          f'<saml:SubjectConfirmationData NotOnOrAfter="{END}"/></saml:SubjectConfirmation>')
CONTEXT = ('<saml:AuthnContext><saml:AuthnContextClassRef>'
           'urn:oasis:names:tc:SAML:2.0:ac:classes:PasswordProtectedTransport'
           '</saml:AuthnContextClassRef></saml:AuthnContext>')
AUTHN = f'<saml:AuthnStatement AuthnInstant="{START}">{CONTEXT}</saml:AuthnStatement>'


def assertion(sig=None, confirmation=BEARER, restrictions="", tail=""):
    return (f'<saml:Assertion xmlns:saml="{SAML}" xmlns:xsi="{XSI}" xmlns:del="{DELEGATION}" Version="2.0" ID="_5f3d" '
            f'IssueInstant="{START}">{ISSUER}{sig or signature()}<saml:Subject>{NAME}{confirmation}</saml:Subject>'
            f'<saml:Conditions NotBefore="{START}" NotOnOrAfter="{END}">{restrictions}</saml:Conditions>{AUTHN}{tail}'
            f'</saml:Assertion>')


def replace(text, old, new):
    assert text.count(old) == 1, f"{text.count(old)} times: {old}"
    return text.replace(old, new)


def name_id(name):
    return f'<saml:NameID Format="{UPN}">{name}</saml:NameID>'


def delegate(name, instant=START):
    return f'<del:Delegate DelegationInstant="{instant}">{name_id(name)}</del:Delegate>'


def attribute(name, *values):
    return (f'<saml:Attribute Name="{name}">'
            + "".join(f"<saml:AttributeValue>{value}</saml:AttributeValue>" for value in values) + "</saml:Attribute>")


def statement(*attributes):
    return "<saml:AttributeStatement>" + "".join(attributes) + "</saml:AttributeStatement>"


def certificate_base64():
    with open(CERTIFICATE) as file:
        return "".join(line.strip() for line in file if "-----" not in line)


def key_data(content):
    return (f'<saml:SubjectConfirmationData xsi:type="saml:KeyInfoConfirmationDataType">{content}'
            f'</saml:SubjectConfirmationData>')


def key_info(base64):
    return (f'<ds:KeyInfo xmlns:ds="http://www.w3.org/2000/09/xmldsig#"><ds:X509Data><ds:X509Certificate>{base64}'
            f'</ds:X509Certificate></ds:X509Data></ds:KeyInfo>')


def holder_of_key(data):
    return f'<saml:SubjectConfirmation Method="urn:oasis:names:tc:SAML:2.0:cm:holder-of-key">{data}</saml:SubjectConfirmation>'


DELEGATION_RESTRICTION = '<saml:Condition xsi:type="del:DelegationRestrictionType">{}</saml:Condition>'
AUDIENCE = "<saml:AudienceRestriction><saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>"


# --- Accepted tokens ---

def meaning(**changes):
    """What the token says: lines that are there only when there is something to say come after the fixed ones."""
    values = {"name": "name {}{}", "flags": "renewable 0, delegable 0, solution 0, confirmation 0", "chain": [],
              "audience": [], "certificate": "none"}
    values.update(changes)
    return ["id {_5f3d}", f"from {START} until {END}", "subject {alice}{example.com}", values["name"], *values["chain"],
            values["flags"], *values["audience"], "certificate " + values["certificate"]]


def spaced(text):
    return text.replace("><", "> <!-- c -->\n\t<")


def make_accepted():
    der = base64.b64decode(certificate_base64())
    plain = sign(assertion())
    default = assertion().replace("<saml:", "<").replace("</saml:", "</").replace("xmlns:saml=", "xmlns=")
    other = assertion().replace("saml:", "a-b.c:").replace("xmlns:saml=", "xmlns:a-b.c=").replace("ds:", "_:").replace("xmlns:ds=", "xmlns:_=")
    comments = f'Algorithm="{EXC}WithComments"'
    prefixes = f'<ds:Transform Algorithm="{EXC}"><ec:InclusiveNamespaces xmlns:ec="{EXC}" PrefixList="xsi del #default"/></ds:Transform>'
    proxies = delegate("proxy1@example.com") + delegate("proxy2@example.com", "2020-06-01T12:00:00.25+02:00")
    cases = [
        ("plain", plain, meaning()),
        ("byte-order-mark", b"\xef\xbb\xbf" + plain.encode(), meaning()),
        ("xml-declaration", '<?xml version="1.0" encoding="UTF-8" standalone="yes"?>\n' + plain + "\n", meaning()),
        ("single-quotes-and-blanks-in-tags", plain.replace('Version="2.0"', "\n  Version = '2.0' "), meaning()),
        ("comments-around", "<!-- a -->" + plain + "\n<!-- b -->\n", meaning()),
        ("cdata", replace(plain, "alice@example.com", "<![CDATA[alice@]]>example.com"), meaning()),
        ("references", replace(plain, "alice@example.com", "&#97;lice&#x40;example.com"), meaning()),
        ("comments-around-a-value", replace(plain, "alice@example.com", "<!--a-->alice@example.com<!--b-->"), meaning()),
        ("comments-and-white-space", sign(spaced(assertion())), meaning()),
        ("default-namespace", sign(default), meaning()),
        ("other-prefixes", sign(other), meaning()),
        ("empty-reference", sign(assertion(signature(uri=""))), meaning()),
        ("inclusive-canonicalisation", sign(assertion(signature(
            transforms=f'<ds:Transform Algorithm="{C14N}"/>', canonicalization=f'Algorithm="{C14N}"'))), meaning()),
        ("canonicalisation-with-comments", sign(assertion(signature(canonicalization=comments))), meaning()),
        ("no-canonicalisation-named", sign(assertion(signature(transforms=""))), meaning()),
        ("inclusive-namespaces", sign(assertion(signature(transforms=prefixes))), meaning()),
        ("rsa-sha384-and-sha384", sign(assertion(signature(
            method=RSA + "384", digest="http://www.w3.org/2001/04/xmldsig-more#sha384"))), meaning()),
        ("rsa-sha512-and-sha512", sign(assertion(signature(
            method=RSA + "512", digest="http://www.w3.org/2001/04/xmlenc#sha512"))), meaning()),
        ("holder-of-key", sign(assertion(confirmation=holder_of_key(key_data(key_info(certificate_base64()))))),
         meaning(flags="renewable 0, delegable 0, solution 0, confirmation 1", certificate=hashlib.sha256(der).hexdigest())),
        ("delegated", sign(assertion(confirmation=replace(BEARER, "<saml:SubjectConfirmationData", name_id("proxy2@example.com")
                                                          + "<saml:SubjectConfirmationData"),
                                     restrictions=DELEGATION_RESTRICTION.format(proxies))),
         meaning(chain=[f"delegate {{proxy1}}{{example.com}} {START}", "delegate {proxy2}{example.com} 2020-06-01T10:00:00.25Z"])),
        ("delegable", sign(assertion(restrictions='<saml:ProxyRestriction Count="10"/>')),
         meaning(flags="renewable 0, delegable 1, solution 0, confirmation 0")),
        ("proxy-count-zero", sign(assertion(restrictions='<saml:ProxyRestriction Count="0"/>')), meaning()),
        ("proxy-without-count", sign(assertion(restrictions='<saml:ProxyRestriction/>')), meaning()),
        ("audiences", sign(assertion(restrictions='<saml:AudienceRestriction ID="_x"><saml:Audience>urn:b</saml:Audience>'
                                     '<saml:Audience>urn:a</saml:Audience></saml:AudienceRestriction>')),
         meaning(audience=["audience {urn:a}", "audience {urn:b}"])),
        ("full-name", sign(assertion(tail=statement(attribute(CLAIMS + "surname", "Liddell"), attribute(CLAIMS + "givenname", "Al\u00efce"),
                                                    attribute("urn:unknown", "x"), attribute("urn:empty")))),
         meaning(name="name {Al\u00efce}{Liddell}")),
        ("confirmed-for-longer", sign(replace(assertion(), f'NotBefore="{START}" NotOnOrAfter="{END}"',
                                              f'NotBefore="{START}" NotOnOrAfter="9999-12-31T23:59:58Z"')),
         [line.replace(END, "9999-12-31T23:59:58Z") for line in meaning()]),
    ]
    return cases


def write_cases(folder, cases):
    lines = []
    for name, text, expected in cases:
        write(os.path.join(HERE, folder, name + ".xml"), text)
        lines.append("\t".join([name, *expected]))
    write(os.path.join(HERE, folder, "expected.txt"), "\n".join(lines) + "\n")


# --- Refused tokens: the plain one with one thing changed ---

PARSE = "Quorlin::ParseException"
SIGNATURE = "Quorlin::InvalidSignatureException"
XML = "Pelmar::Xml::XMLParseException"
TAMPERED = "Failed to verify signature: token might have been tampered with."
TYPE = XSI + ":type"
UNKNOWN = "Unknown or duplicate restriction node under Conditions"


def missing(element):
    return f"Expected element '{element}' not found."


def namespace(element):
    return f"Element '{element}' has unexpected namespace"


def textual(element):
    return f"Element '{element}' must only have textual content"


def no_attribute(element, name):
    return f"Node '{element} is missing required attribute '{name}'"


def unexpected(element):
    return f"Unexpected attributes on element '{element}'"


def place(text, part):
    before = text[:text.index(part)]
    return f" at line {before.count(chr(10)) + 1}, column {len(before) - before.rfind(chr(10))}"


def refusals(plain):
    cases = []
    period = f'NotBefore="{START}" NotOnOrAfter="{END}"'
    # Canonically the same, with room for restrictions.
    plain = replace(plain, f"<saml:Conditions {period}/>", f"<saml:Conditions {period}></saml:Conditions>")

    def change(name, old, new, text, klass=PARSE, at=None):
        altered = replace(plain, old, new)
        cases.append((name, altered, [klass, text + (place(altered, at) if at else "")]))

    def remove(name, old, text, klass=PARSE, at=None):
        change(name, old, "", text, klass, at)

    def restrict(name, restrictions, text):
        change(name, "</saml:Conditions>", restrictions + "</saml:Conditions>", text)

    def append(name, content, text):
        change(name, "</saml:Assertion>", content + "</saml:Assertion>", text)

    def confirm(name, confirmation, text):
        change(name, BEARER, confirmation, text)

    end = "<saml:AuthnStatement"
    # Assertion
    change("assertion-version-1.1", 'Version="2.0"', 'Version="1.1"', "Invalid token version")
    change("assertion-id-without-underscore", 'ID="_5f3d"', 'ID="5f3d"', "Token's signature must cover the entire token")
    change("assertion-id-other-case", 'ID="_5f3d"', 'ID="_5F3D"', "Token's signature must cover the entire token")
    remove("assertion-no-version", ' Version="2.0"', no_attribute("Assertion", "Version"))
    remove("assertion-no-id", ' ID="_5f3d"', no_attribute("Assertion", "ID"))
    remove("assertion-no-issue-instant", f' IssueInstant="{START}"', no_attribute("Assertion", "IssueInstant"))
    change("assertion-issue-instant-no-date", f' IssueInstant="{START}"', ' IssueInstant="2020-01-01"', "Assertion/@IssueInstant is not a date")
    change("assertion-extra-attribute", ' Version="2.0"', ' Version="2.0" x=""', unexpected("Assertion"))
    change("assertion-extra-prefixed-attribute", ' Version="2.0"', ' Version="2.0" xsi:schemaLocation="a b"', unexpected("Assertion"))
    change("assertion-other-namespace", f'xmlns:saml="{SAML}"', 'xmlns:saml="urn:oasis:names:tc:SAML:1.0:assertion"', namespace("Assertion"))
    append("assertion-text-at-end", "x", "Unexpected elements under Assertion")
    append("assertion-instruction-at-end", "<?p?>", "Unexpected elements under Assertion")
    append("assertion-second-authn-statement", AUTHN, "Unexpected elements under Assertion")
    append("assertion-two-attribute-statements", statement(attribute("n")) * 2, "Unexpected elements under Assertion")
    append("assertion-signature-at-end", "<ds:Signature xmlns:ds=\"http://www.w3.org/2000/09/xmldsig#\"/>", "Unexpected elements under Assertion")
    # Issuer
    remove("issuer-missing", ISSUER, missing("Issuer"))
    change("issuer-other-namespace", "<saml:Issuer Format=", '<saml:Issuer xmlns:saml="urn:x" Format=', namespace("Issuer"))
    change("issuer-no-format", "<saml:Issuer Format=", "<saml:Issuer format=", no_attribute("Issuer", "Format"))
    change("issuer-name-qualifier", "<saml:Issuer ", '<saml:Issuer NameQualifier="q" ', unexpected("Issuer"))
    remove("issuer-empty", "https://sts.example/", textual("Issuer"))
    # Signature
    remove("signature-missing", plain[plain.index("<ds:Signature "):plain.index("</ds:Signature>") + 15],
           "Signature syntax error: Element 'saml:Subject' is not a signature", at="<saml:Subject>")
    change("signature-twice", plain[plain.index("<ds:Signature "):plain.index("</ds:Signature>") + 15],
           plain[plain.index("<ds:Signature "):plain.index("</ds:Signature>") + 15] * 2, missing("Subject"))
    change("signature-text-in-its-place", "</saml:Issuer>", "</saml:Issuer>x", "Expected element ds:Signature not found")
    change("signature-object", "</ds:Signature>", "<ds:Object/></ds:Signature>",
           "Signature syntax error: Unexpected element 'ds:Object' in 'ds:Signature'", at="<ds:Object/>")
    change("signature-covers-something-else", 'URI="#_5f3d"', 'URI="#_5f3e"', "Token's signature must cover the entire token")
    change("signature-reference-without-number-sign", 'URI="#_5f3d"', 'URI="_5f3d"', "Token's signature must cover the entire token")
    remove("signature-reference-without-uri", ' URI="#_5f3d"', "Signature syntax error: Attribute 'URI' is missing in 'ds:Reference'", at="<ds:Reference")
    # Subject
    remove("subject-missing", f"<saml:Subject>{NAME}{BEARER}</saml:Subject>", missing("Subject"))
    change("subject-attribute", "<saml:Subject>", '<saml:Subject x="">', unexpected("Subject"))
    change("subject-other-namespace", "<saml:Subject>", '<saml:Subject xmlns:saml="urn:x">', namespace("Subject"))
    remove("subject-no-name-id", NAME, missing("NameID"))
    change("subject-encrypted-id", NAME, "<saml:EncryptedID/>", missing("NameID"))
    change("subject-base-id", NAME, "<saml:BaseID/>", missing("NameID"))
    change("subject-two-names", NAME, NAME + NAME, missing("SubjectConfirmation"))
    remove("subject-no-confirmation", BEARER, missing("SubjectConfirmation"))
    change("subject-two-confirmations", BEARER, BEARER + BEARER, "Unexpected elements after SubjectConfirmation")
    change("name-id-no-format", f'<saml:NameID Format="{UPN}">', "<saml:NameID>", no_attribute("NameID", "Format"))
    change("name-id-sp-name-qualifier", "<saml:NameID ", '<saml:NameID SPNameQualifier="q" ', unexpected("NameID"))
    change("name-id-empty", "alice@example.com", "", textual("NameID"))
    change("name-id-white-space", "alice@example.com", " \n", textual("NameID"))
    change("name-id-split-by-comment", "alice@example.com", "alice@example<!---->.com", textual("NameID"))
    change("name-id-split-by-instruction", "alice@example.com", "alice@example<?p?>.com", textual("NameID"))
    change("name-id-holds-element", "alice@example.com", "alice@example.com<b/>", textual("NameID"))
    # Confirmation
    confirm("confirmation-sender-vouches", BEARER.replace("cm:bearer", "cm:sender-vouches"),
            "Unknown subject confirmation method: 'urn:oasis:names:tc:SAML:2.0:cm:sender-vouches'")
    confirm("confirmation-no-method", BEARER.replace(" Method=", " method="), no_attribute("SubjectConfirmation", "Method"))
    confirm("confirmation-extra-attribute", BEARER.replace(" Method=", ' x="" Method='), unexpected("SubjectConfirmation"))
    confirm("confirmation-no-data", BEARER.replace(f'<saml:SubjectConfirmationData NotOnOrAfter="{END}"/>', ""), missing("SubjectConfirmationData"))
    confirm("confirmation-something-after-data", BEARER.replace("/></saml:S", "/><saml:NameID/></saml:S"),
            "Unexpected elements after SubjectConfirmationData")
    confirm("bearer-no-end", BEARER.replace(f' NotOnOrAfter="{END}"', ""), no_attribute("SubjectConfirmationData", "NotOnOrAfter"))
    confirm("bearer-end-no-date", BEARER.replace(END, "never"), "SubjectConfirmationData/@NotOnOrAfter is not a date")
    confirm("bearer-recipient", BEARER.replace("Data Not", 'Data Recipient="r" Not'), unexpected("SubjectConfirmationData"))
    confirm("bearer-content", BEARER.replace("/></saml:S", ">x</saml:SubjectConfirmationData></saml:S"),
            "Element 'SubjectConfirmationData' must be empty")
    confirm("bearer-ends-too-early", BEARER.replace(END, "9999-12-31T23:59:58Z"), "Invalid token subject validity")
    certificate = key_info(certificate_base64())
    confirm("holder-of-key-no-type", holder_of_key(f"<saml:SubjectConfirmationData>{certificate}</saml:SubjectConfirmationData>"),
            no_attribute("SubjectConfirmationData", TYPE))
    confirm("holder-of-key-other-type", holder_of_key(key_data(certificate).replace("KeyInfoC", "SubjectC")),
            "Invalid SubjectConfirmationData type: 'saml:SubjectConfirmationDataType'")
    confirm("holder-of-key-unprefixed-type", holder_of_key(key_data(certificate).replace("saml:KeyInfoC", "KeyInfoC")),
            "Invalid SubjectConfirmationData type: 'KeyInfoConfirmationDataType'")
    confirm("holder-of-key-recipient", holder_of_key(key_data(certificate).replace(" xsi:type", ' Recipient="r" xsi:type')),
            "Unexpected attribute 'Recipient' on element 'SubjectConfirmationData'")
    confirm("holder-of-key-no-key-info", holder_of_key(key_data("")), missing("KeyInfo"))
    confirm("holder-of-key-two-key-infos", holder_of_key(key_data(certificate * 2)),
            "Unexpected elements after SubjectConfirmationData/KeyInfo")
    confirm("holder-of-key-key-value", holder_of_key(key_data(
        '<ds:KeyInfo xmlns:ds="http://www.w3.org/2000/09/xmldsig#"><ds:KeyValue/></ds:KeyInfo>')), missing("X509Data"))
    confirm("holder-of-key-key-info-attribute", holder_of_key(key_data(certificate.replace("<ds:KeyInfo ", '<ds:KeyInfo Id="k" '))),
            unexpected("KeyInfo"))
    confirm("holder-of-key-key-name-after", holder_of_key(key_data(certificate.replace("</ds:KeyInfo>", "<ds:KeyName>k</ds:KeyName></ds:KeyInfo>"))),
            "Unexpected elements after X509Data")
    confirm("holder-of-key-two-certificates", holder_of_key(key_data(certificate.replace(
        "</ds:X509Data>", "<ds:X509Certificate>MA==</ds:X509Certificate></ds:X509Data>"))), "Unexpected elements after X509Certificate")
    confirm("holder-of-key-no-certificate", holder_of_key(key_data(key_info(""))), textual("X509Certificate"))
    cases.append(("holder-of-key-no-base64", replace(plain, BEARER, holder_of_key(key_data(key_info("?")))),
                  ["Pelmar::Base64FormatException", "Invalid base64 text: the length is not a multiple of four"]))
    # Conditions
    remove("conditions-missing", f"<saml:Conditions {period}></saml:Conditions>", missing("Conditions"))
    change("conditions-no-start", period, f'NotOnOrAfter="{END}"', no_attribute("Conditions", "NotBefore"))
    change("conditions-no-end", period, f'NotBefore="{START}"', no_attribute("Conditions", "NotOnOrAfter"))
    change("conditions-start-no-date", period, f'NotBefore="then" NotOnOrAfter="{END}"', "Conditions/@NotBefore is not a date")
    change("conditions-end-no-date", period, f'NotBefore="{START}" NotOnOrAfter="10000-01-01T00:00:00Z"', "Conditions/@NotOnOrAfter is not a date")
    change("conditions-extra-attribute", period, period + ' x=""', unexpected("Conditions"))
    change("conditions-start-equals-end", period, f'NotBefore="{END}" NotOnOrAfter="{END}"',
           "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.")
    change("conditions-start-after-end", period, f'NotBefore="{END}" NotOnOrAfter="{START}"',
           "Unsatisfiable token validity conditions: NotBefore must be less than NotOnOrAfter.")
    change("conditions-in-the-future", period, f'NotBefore="9999-01-01T00:00:00Z" NotOnOrAfter="{END}"',
           "Token start date is in the future: 9999-01-01T00:00:00Z")
    change("conditions-in-the-past", period, f'NotBefore="{START}" NotOnOrAfter="2020-01-02T01:00:00+01:00"',
           "The token has expired at: 2020-01-02T00:00:00Z")
    restrict("restriction-one-time-use", "<saml:OneTimeUse/>", UNKNOWN + ": OneTimeUse")
    restrict("restriction-text", "x", UNKNOWN)
    restrict("restriction-two-audiences", AUDIENCE * 2, UNKNOWN + ": AudienceRestriction")
    restrict("restriction-two-proxies", "<saml:ProxyRestriction/>" * 2, UNKNOWN + ": ProxyRestriction")
    restrict("restriction-without-type", "<saml:Condition/>", UNKNOWN + ": Condition")
    restrict("restriction-renew-twice", ('<saml:Condition xmlns:e="{vendor}/names/2009/12/std-ext/SAML2.0" '
                                         'xsi:type="e:RenewRestrictionType"/>') * 2, UNKNOWN + ": Condition")
    restrict("restriction-renew-extra-attribute", '<saml:Condition xmlns:e="{vendor}/names/2009/12/std-ext/SAML2.0" '
             'xsi:type="e:RenewRestrictionType" Max="1"/>', "Unexpected attribute 'Max' on element 'Condition'")
    restrict("restriction-renew-count", '<saml:Condition xmlns:e="{vendor}/names/2009/12/std-ext/SAML2.0" '
             'xsi:type="e:RenewRestrictionType" Count="1.5"/>', "Condition/@Count is not a non-negative integer.")
    restrict("restriction-undeclared-prefix", "\n      <saml:Condition xsi:type=\"foo:RenewRestrictionType\"/>",
             f"Element Conditionat {plain.count(chr(10)) + 2},7 uses undefined prefix: `foo'")
    restrict("audience-none", "<saml:AudienceRestriction/>", missing("Audience"))
    restrict("audience-empty", "<saml:AudienceRestriction><saml:Audience/></saml:AudienceRestriction>", textual("Audience"))
    restrict("audience-other-element", "<saml:AudienceRestriction><saml:Other/></saml:AudienceRestriction>", missing("Audience"))
    restrict("proxy-audience", "<saml:ProxyRestriction><saml:Audience>a</saml:Audience></saml:ProxyRestriction>",
             "Element 'ProxyRestriction' must be empty")
    restrict("proxy-extra-attribute", '<saml:ProxyRestriction x=""/>', unexpected("ProxyRestriction"))
    restrict("proxy-count-negative", '<saml:ProxyRestriction Count="-1"/>', "ProxyRestriction/@Count is not a non-negative integer.")
    restrict("proxy-count-too-large", '<saml:ProxyRestriction Count="9223372036854775808"/>',
             "ProxyRestriction/@Count is not a non-negative integer.")
    restrict("delegation-without-delegate-id", DELEGATION_RESTRICTION.format(delegate("p@e")),
             "Token has delegation restriction, but no delegate id is present in the SubjectConfirmation")
    restrict("delegation-none", DELEGATION_RESTRICTION.format(""), missing("Delegate"))
    restrict("delegation-extra-attribute", DELEGATION_RESTRICTION.format("").replace(" xsi", ' Count="1" xsi'),
             "Unexpected attribute 'Count' on element 'Condition'")
    restrict("delegate-no-instant", DELEGATION_RESTRICTION.format("<del:Delegate/>"), no_attribute("Delegate", "DelegationInstant"))
    restrict("delegate-no-date", DELEGATION_RESTRICTION.format(delegate("p@e", "then")), "Delegate/@DelegationInstant is not a date")
    restrict("delegate-extra-attribute", DELEGATION_RESTRICTION.format(delegate("p@e").replace(" Deleg", ' x="" Deleg')), unexpected("Delegate"))
    restrict("delegate-no-name", DELEGATION_RESTRICTION.format(f'<del:Delegate DelegationInstant="{START}"/>'), missing("NameID"))
    restrict("delegate-other-namespace", DELEGATION_RESTRICTION.format(delegate("p@e").replace("del:", "saml:")), namespace("Delegate"))
    confirm("delegate-id-without-delegation", BEARER.replace("<saml:SubjectConfirmationData", name_id("p@e") + "<saml:SubjectConfirmationData"),
            "Token SubjectConfirmation contains delegate id, but no delegation restriction is present")
    delegated = replace(plain, BEARER, BEARER.replace("<saml:SubjectConfirmationData", name_id("p1@e") + "<saml:SubjectConfirmationData"))
    cases.append(("delegate-id-not-the-last", replace(delegated, "</saml:Conditions>", DELEGATION_RESTRICTION.format(
        delegate("p1@e") + delegate("p2@e")) + "</saml:Conditions>"),
        [PARSE, "The SubjectConfirmation delegate id does not match the id of the last delegate"]))
    # Advice, statements and attributes
    change("advice-empty", end, "<saml:Advice/>" + end, missing("RSAAdvice"))
    change("advice-assertion", end, "<saml:Advice><saml:AssertionIDRef>a</saml:AssertionIDRef></saml:Advice>" + end, missing("RSAAdvice"))
    change("advice-attribute", end, '<saml:Advice x=""/>' + end, unexpected("Advice"))
    change("advice-other-namespace", end, "<saml:Advice><saml:RSAAdvice/></saml:Advice>" + end, namespace("RSAAdvice"))
    rsa = '<saml:Advice><e:RSAAdvice xmlns:e="{vendor}/names/2009/12/std-ext/SAML2.0"%s/></saml:Advice>'
    change("advice-no-source", end, rsa % "" + end, no_attribute("RSAAdvice", "AdviceSource"))
    change("advice-extra-attribute", end, rsa % ' AdviceSource="s" x=""' + end, unexpected("RSAAdvice"))
    change("advice-no-attribute", end, rsa % ' AdviceSource="s"' + end, missing("Attribute"))
    remove("authn-missing", AUTHN, missing("AuthnStatement"))
    change("authn-authz-decision-first", end, "<saml:AuthzDecisionStatement/>" + end, missing("AuthnStatement"))
    change("authn-no-instant", " AuthnInstant=", " Instant=", no_attribute("AuthnStatement", "AuthnInstant"))
    change("authn-no-date", f' AuthnInstant="{START}"', ' AuthnInstant=""', "AuthnStatement/@AuthnInstant is not a date")
    change("authn-session-index", " AuthnInstant=", ' SessionIndex="1" AuthnInstant=', unexpected("AuthnStatement"))
    change("authn-subject-locality", CONTEXT, "<saml:SubjectLocality/>" + CONTEXT, missing("AuthnContext"))
    change("authn-two-contexts", CONTEXT, CONTEXT * 2, "Unexpected elements after AuthnContext")
    change("authn-context-attribute", "<saml:AuthnContext>", '<saml:AuthnContext x="">', unexpected("AuthnContext"))
    change("authn-context-empty", CONTEXT, "<saml:AuthnContext/>", missing("AuthnContextClassRef"))
    change("authn-context-declaration-after", "</saml:AuthnContextClassRef>", "</saml:AuthnContextClassRef><saml:AuthnContextDecl/>",
           "Unexpected elements after AuthnContextClassRef")
    append("attributes-none", "<saml:AttributeStatement/>", missing("Attribute"))
    append("attributes-extra-attribute", '<saml:AttributeStatement x=""/>', unexpected("AttributeStatement"))
    append("attributes-encrypted", statement("<saml:EncryptedAttribute/>"), missing("Attribute"))
    append("attribute-no-name", statement("<saml:Attribute/>"), no_attribute("Attribute", "Name"))
    append("attribute-extra-attribute", statement('<saml:Attribute Name="n" x=""/>'), unexpected("Attribute"))
    append("attribute-other-element", statement('<saml:Attribute Name="n"><saml:Other/></saml:Attribute>'), missing("AttributeValue"))
    append("attribute-value-empty", statement(attribute("n", "")), textual("AttributeValue"))
    append("attribute-value-split", statement(attribute("n", "a<!---->b")), textual("AttributeValue"))
    append("attribute-value-element", statement(attribute("n", "<a/>")), textual("AttributeValue"))
    # What only the signature gives away
    change("altered-subject", "alice@", "mallory@", TAMPERED, SIGNATURE)
    change("altered-white-space", "<saml:Subject>", "<saml:Subject> ", TAMPERED, SIGNATURE)
    change("altered-further-attributes", "</saml:Assertion>", statement(attribute("n")) + "</saml:Assertion>", TAMPERED, SIGNATURE)
    change("altered-restrictions", "</saml:Conditions>", '<saml:ProxyRestriction Count="9"/></saml:Conditions>', TAMPERED, SIGNATURE)
    change("altered-signed-info", "<ds:SignedInfo>", '<ds:SignedInfo Id="i">', TAMPERED, SIGNATURE)
    change("sha1-digest", f'<ds:DigestMethod Algorithm="{SHA256}"', '<ds:DigestMethod Algorithm="http://www.w3.org/2000/09/xmldsig#sha1"',
           "Signature verification error. Digest method 'http://www.w3.org/2000/09/xmldsig#sha1' is not accepted", SIGNATURE)
    change("sha1-signature", RSA + "256", "http://www.w3.org/2000/09/xmldsig#rsa-sha1",
           "Signature verification error. Signature method 'http://www.w3.org/2000/09/xmldsig#rsa-sha1' is not accepted", SIGNATURE)
    change("hmac-signature", RSA + "256", "http://www.w3.org/2001/04/xmldsig-more#hmac-sha256",
           "Signature verification error. Signature method 'http://www.w3.org/2001/04/xmldsig-more#hmac-sha256' is not accepted", SIGNATURE)
    change("xpath-transform", "</ds:Transforms>", '<ds:Transform Algorithm="http://www.w3.org/TR/1999/REC-xpath-19991116"><ds:XPath>1</ds:XPath>'
           "</ds:Transform></ds:Transforms>",
           "Signature verification error. Transform 'http://www.w3.org/TR/1999/REC-xpath-19991116' is not accepted", SIGNATURE)
    key_info_text = plain[plain.index("<ds:KeyInfo"):plain.index("</ds:KeyInfo>") + 13]
    remove("no-key-info", key_info_text, "Signature verification error. The signature has no KeyInfo", SIGNATURE)
    change("bare-key-value", key_info_text, "<ds:KeyInfo><ds:KeyValue/></ds:KeyInfo>",
           "Signature verification error. The signature's KeyInfo holds no certificate", SIGNATURE)
    # No XML as it is accepted
    cases.append(("xml-doctype", "<!DOCTYPE x>" + plain, [XML, "DOCTYPE is not allowed at line 1, column 1"]))
    cases.append(("xml-doctype-with-entity", '<!DOCTYPE x [<!ENTITY e "alice">]>' + replace(plain, "alice@", "&e;@"),
                  [XML, "DOCTYPE is not allowed at line 1, column 1"]))
    change("xml-undefined-entity", "alice@", "&alice;@", "undefined entity", XML, at="&alice;")
    change("xml-duplicate-attribute", ' ID="_5f3d"', ' ID="_5f3d" ID="_5f3d"', "duplicate attribute", XML, at='ID="_5f3d" Issue')
    cases.append(("xml-two-documents", plain + plain, [XML, "junk after document element" + place(plain + "|", "|")]))
    cases.append(("xml-cut-off", plain[:-1], [XML, "unclosed token" + place(plain, "</saml:Assertion>")]))
    cases.append(("xml-utf-16", "\ufeff".encode("utf-16-le") + plain.encode("utf-16-le"), [XML, "only UTF-8 is accepted at line 1, column 1"]))
    cases.append(("xml-latin-1", '<?xml version="1.0" encoding="ISO-8859-1"?>' + plain, [XML, "only UTF-8 is accepted at line 1, column 1"]))
    cases.append(("xml-invalid-utf-8", replace(plain, "alice@", "al\0ice@").encode().replace(b"\0", b"\xc0\xaf"),
                  [XML, "not well-formed (invalid token)" + place(replace(plain, "alice@", "al\0ice@"), "\0")]))
    cases.append(("xml-nul", replace(plain, "alice@", "al\0ice@"),
                  [XML, "not well-formed (invalid token)" + place(replace(plain, "alice@", "al\0ice@"), "\0")]))
    cases.append(("xml-empty", "", [XML, "no element found at line 1, column 1"]))
    return cases


# --- Fuzzing ---

HEADER = """// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// Made by tests/vectors/tokens/make.py.

#ifndef QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H
#define QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H

/// The certificate of the key that signed the seeds.
constexpr const char* kTrustedCertificate =
%s;

/// All that this key ever signed.
constexpr const char* kOriginalMeanings[] = {
%s};

#endif  // QUORLIN_FUZZ_SAMLTOKENFUZZORIGINALS_H
"""


def literal(lines):
    # Octal escapes end by themselves, unlike hexadecimal ones.
    quoted = []
    for line in lines:
        escaped = "".join(chr(byte) if 32 <= byte < 127 and byte not in b'"\\' else f"\\{byte:03o}" for byte in line.encode())
        quoted.append(f'    "{escaped}\\n"')
    return "\n".join(quoted)


def make_fuzz_files(accepted, refused):
    with open(CERTIFICATE) as file:
        certificate = file.read().splitlines()
    meanings = sorted({tuple(expected) for _, _, expected in accepted})
    write(f"{FUZZ}/SamlTokenFuzzOriginals.h", HEADER % (literal(certificate), ",\n".join(literal(lines) for lines in meanings)))
    corpus = f"{FUZZ}/corpus/SamlTokenFuzz"
    os.makedirs(corpus, exist_ok=True)
    for name, text, _ in accepted:
        write(f"{corpus}/accept-{name}", text)
    for name, text, _ in refused:
        write(f"{corpus}/reject-{name}", text)


if __name__ == "__main__":
    make_certificate()
    accepted_cases = make_accepted()
    refused_cases = refusals(accepted_cases[0][1])
    write_cases("accept", accepted_cases)
    write_cases("reject", refused_cases)
    make_fuzz_files(accepted_cases, refused_cases)
