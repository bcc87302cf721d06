#!/usr/bin/env python3
# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
#
# Writes <name>.c14n beside every <name>.xml given: what libxml2 makes of the document's first element named Assertion as a
# document subset in Canonical XML 1.0 without comments.

import ctypes
import sys

XPATH = b"""
(//*[local-name()='Assertion'])[1]/descendant-or-self::node() |
(//*[local-name()='Assertion'])[1]/descendant-or-self::*/@* |
(//*[local-name()='Assertion'])[1]/descendant-or-self::*/namespace::*
"""
INCLUSIVE_1_0 = 0


class XPathObject(ctypes.Structure):
    _fields_ = [("type", ctypes.c_int), ("nodesetval", ctypes.c_void_p)]


xml = ctypes.CDLL("libxml2.so.2")
xml.xmlReadFile.restype = ctypes.c_void_p
xml.xmlXPathNewContext.restype = ctypes.c_void_p
xml.xmlXPathNewContext.argtypes = [ctypes.c_void_p]
xml.xmlXPathEvalExpression.restype = ctypes.POINTER(XPathObject)
xml.xmlXPathEvalExpression.argtypes = [ctypes.c_char_p, ctypes.c_void_p]
xml.xmlC14NDocDumpMemory.argtypes = [ctypes.c_void_p, ctypes.c_void_p, ctypes.c_int, ctypes.c_void_p, ctypes.c_int,
                                     ctypes.POINTER(ctypes.c_void_p)]


def canonicalise(path):
    document = xml.xmlReadFile(path.encode(), None, 0)
    if not document:
        raise SystemExit(path + ": not well-formed")
    nodes = xml.xmlXPathEvalExpression(XPATH, xml.xmlXPathNewContext(document)).contents.nodesetval
    text = ctypes.c_void_p()
    size = xml.xmlC14NDocDumpMemory(document, nodes, INCLUSIVE_1_0, None, 0, ctypes.byref(text))
    if size <= 0:
        raise SystemExit(path + ": cannot be canonicalised")
    return ctypes.string_at(text, size)


for name in sys.argv[1:]:
    with open(name.removesuffix(".xml") + ".c14n", "wb") as output:
        output.write(canonicalise(name))
