# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors
"""Canonicalises with libxml2 what standard input asks for, and writes the results to standard output.

A request is one line "EXCLUSIVE COMMENTS APEX OMITTED SIZE PREFIX...", then SIZE bytes of XML and a line feed. EXCLUSIVE and
COMMENTS are 0 or 1. APEX and OMITTED number an element in document order, from 1; APEX 0 is the whole document, OMITTED 0 omits
nothing. An answer is one line with the number of bytes, the bytes and a line feed; -1 bytes stand for "no canonical form".
"""

import ctypes
import sys

libxml2 = ctypes.CDLL("libxml2.so.2")


class XPathObject(ctypes.Structure):
    _fields_ = [("type", ctypes.c_int), ("nodes", ctypes.c_void_p)]


libxml2.xmlReadMemory.restype = ctypes.c_void_p
libxml2.xmlReadMemory.argtypes = [ctypes.c_char_p, ctypes.c_int, ctypes.c_char_p, ctypes.c_char_p, ctypes.c_int]
libxml2.xmlFreeDoc.argtypes = [ctypes.c_void_p]
libxml2.xmlXPathNewContext.restype = ctypes.c_void_p
libxml2.xmlXPathNewContext.argtypes = [ctypes.c_void_p]
libxml2.xmlXPathFreeContext.argtypes = [ctypes.c_void_p]
libxml2.xmlXPathEvalExpression.restype = ctypes.POINTER(XPathObject)
libxml2.xmlXPathEvalExpression.argtypes = [ctypes.c_char_p, ctypes.c_void_p]
libxml2.xmlXPathFreeObject.argtypes = [ctypes.POINTER(XPathObject)]
libxml2.xmlC14NDocDumpMemory.restype = ctypes.c_int
libxml2.xmlC14NDocDumpMemory.argtypes = [
    ctypes.c_void_p, ctypes.c_void_p, ctypes.c_int, ctypes.c_void_p, ctypes.c_int, ctypes.POINTER(ctypes.c_void_p)]
xmlFree = ctypes.CFUNCTYPE(None, ctypes.c_void_p)(ctypes.c_void_p.in_dll(libxml2, "xmlFree").value)

READ_QUIETLY = 32 | 64 | 2048  # XML_PARSE_NOERROR, XML_PARSE_NOWARNING, XML_PARSE_NONET


def node_set(apex, omitted):
    """The XPath expression of the subtree, attributes and namespaces included."""
    top = "(//*)[%d]" % apex if apex else "/"
    kept = ""
    if omitted:
        kept = "[count(ancestor-or-self::node() | (//*)[%d]) != count(ancestor-or-self::node())]" % omitted
    nodes = "%s/descendant-or-self::node()%s" % (top, kept)
    elements = "%s/descendant-or-self::*%s" % (top, kept)
    return "%s | %s/attribute::* | %s/namespace::*" % (nodes, elements, elements)


def dump(document, nodes, exclusive, comments, prefixes):
    prefix_list = (ctypes.c_char_p * (len(prefixes) + 1))(*prefixes, None)
    result = ctypes.c_void_p()
    size = libxml2.xmlC14NDocDumpMemory(document, nodes, exclusive, prefix_list, comments, ctypes.byref(result))
    if size < 0:
        return None
    text = ctypes.string_at(result, size)
    xmlFree(result)
    return text


def canonicalize(text, exclusive, comments, apex, omitted, prefixes):
    document = libxml2.xmlReadMemory(text, len(text), None, None, READ_QUIETLY)
    if not document:
        return None
    try:
        if not apex and not omitted:
            return dump(document, None, exclusive, comments, prefixes)
        context = libxml2.xmlXPathNewContext(document)
        found = libxml2.xmlXPathEvalExpression(node_set(apex, omitted).encode(), context)
        try:
            return dump(document, found.contents.nodes, exclusive, comments, prefixes)
        finally:
            libxml2.xmlXPathFreeObject(found)
            libxml2.xmlXPathFreeContext(context)
    finally:
        libxml2.xmlFreeDoc(document)


def main():
    source, sink = sys.stdin.buffer, sys.stdout.buffer
    while True:
        header = source.readline().split()
        if not header:
            return
        exclusive, comments, apex, omitted, size = (int(field) for field in header[:5])
        text = source.read(size)
        source.readline()
        answer = canonicalize(text, exclusive, comments, apex, omitted, header[5:])
        sink.write(b"-1\n\n" if answer is None else b"%d\n%s\n" % (len(answer), answer))


main()
