# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""lxml with python-xmlsec, which is libxmlsec1 again under a Python face (see bench/peers/README.md for the conversation)."""

import sys
from pathlib import Path

import xmlsec
from lxml import etree

SAML = "{urn:oasis:names:tc:SAML:2.0:assertion}"
SIGNATURE = "{http://www.w3.org/2000/09/xmldsig#}Signature"
REFERENCE = "{http://www.w3.org/2000/09/xmldsig#}Reference"
KEY_INFO = "{http://www.w3.org/2000/09/xmldsig#}KeyInfo"
X509_DATA = "{http://www.w3.org/2000/09/xmldsig#}X509Data"


def load_trusted(path):
    manager = xmlsec.KeysManager()
    manager.load_cert(path, xmlsec.constants.KeyDataFormatPem, xmlsec.constants.KeyDataTypeTrusted)
    return manager


def require(holds, what):
    if not holds:
        raise ValueError(what)


def validate(text, manager, group_attribute):
    """The subject and the groups of a token, or an exception."""
    parser = etree.XMLParser(resolve_entities=False, no_network=True, huge_tree=False)
    assertion = etree.fromstring(text, parser)
    require(assertion.tag == SAML + "Assertion", "not an assertion")
    signature = assertion.find(SIGNATURE)
    require(signature is not None, "no signature")
    # Otherwise a bare key in the token would do.
    require([child.tag for child in signature.find(KEY_INFO)] == [X509_DATA], "no certificate")
    context = xmlsec.SignatureContext(manager)
    context.register_id(assertion, "ID")
    context.verify(signature)
    references = [reference.get("URI") for reference in signature[0].findall(REFERENCE)]
    require(references == ["#" + assertion.get("ID")], "a reference to something else")
    subject = assertion.find(f"{SAML}Subject/{SAML}NameID").text
    groups = [
        value.text
        for attribute in assertion.find(f"{SAML}AttributeStatement").findall(f"{SAML}Attribute")
        if attribute.get("Name") == group_attribute
        for value in attribute.findall(f"{SAML}AttributeValue")
    ]
    return subject, groups


def check(path, manager, group_attribute):
    try:
        subject, groups = validate(Path(path).read_bytes(), manager, group_attribute)
    except Exception as error:  # Whatever it is, the token was refused.
        reason = str(error).split("\n", maxsplit=1)[0]
        return f"refused {reason}"
    return f"accepted {subject} {len(groups)}"


def main():
    group_attribute, *files = sys.argv[1:]
    tokens = [Path(path).read_bytes() for path in files[::2]]
    managers = [load_trusted(path) for path in files[1::2]]
    print("ready python-xmlsec", xmlsec.__version__, flush=True)
    for line in sys.stdin:
        order, which, what = line.split()
        manager = managers[int(which)]
        if order == "check":
            print(check(what, manager, group_attribute), flush=True)
        else:
            token = tokens[int(which)]
            for _ in range(int(what)):
                validate(token, manager, group_attribute)
            print("done", flush=True)


main()
