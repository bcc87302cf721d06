// SPDX-License-Identifier: Apache-2.0
// Copyright the Quorlin authors

// The XML signatures of the Java platform itself (javax.xml.crypto.dsig), over its DOM; see
// bench/peers/README.md for the conversation.

import java.io.BufferedReader;
import java.io.ByteArrayInputStream;
import java.io.IOException;
import java.io.InputStream;
import java.io.InputStreamReader;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.GeneralSecurityException;
import java.security.Key;
import java.security.cert.CertPathValidator;
import java.security.cert.CertificateFactory;
import java.security.cert.PKIXParameters;
import java.security.cert.TrustAnchor;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.List;
import java.util.Set;
import javax.xml.crypto.AlgorithmMethod;
import javax.xml.crypto.KeySelector;
import javax.xml.crypto.KeySelectorException;
import javax.xml.crypto.KeySelectorResult;
import javax.xml.crypto.XMLCryptoContext;
import javax.xml.crypto.XMLStructure;
import javax.xml.crypto.dsig.Reference;
import javax.xml.crypto.dsig.XMLSignature;
import javax.xml.crypto.dsig.XMLSignatureFactory;
import javax.xml.crypto.dsig.dom.DOMValidateContext;
import javax.xml.crypto.dsig.keyinfo.KeyInfo;
import javax.xml.crypto.dsig.keyinfo.X509Data;
import javax.xml.parsers.DocumentBuilderFactory;
import org.w3c.dom.Element;
import org.w3c.dom.Node;

final class JavaDsig {
  private static final String SAML = "urn:oasis:names:tc:SAML:2.0:assertion";

  /** What was read out of a token that was accepted. */
  private record Findings(String subject, List<String> groups) {}

  /** The key of the shown certificate, once that one is found to chain to the trusted one. */
  private static final class TrustedKeySelector extends KeySelector {
    private final X509Certificate trusted;
    private final PKIXParameters parameters;
    private final CertificateFactory factory;
    private final CertPathValidator validator;

    TrustedKeySelector(X509Certificate trusted, CertificateFactory factory)
        throws GeneralSecurityException {
      this.trusted = trusted;
      this.factory = factory;
      parameters = new PKIXParameters(Set.of(new TrustAnchor(trusted, null)));
      parameters.setRevocationEnabled(false);
      validator = CertPathValidator.getInstance("PKIX");
    }

    @Override
    public KeySelectorResult select(
        KeyInfo keyInfo, Purpose purpose, AlgorithmMethod method, XMLCryptoContext context)
        throws KeySelectorException {
      List<X509Certificate> shown = collectCertificates(keyInfo);
      if (shown.isEmpty()) {
        throw new KeySelectorException("no certificate");
      }
      try {
        requireChain(shown);
      } catch (GeneralSecurityException e) {
        throw new KeySelectorException(e);
      }
      Key key = shown.get(0).getPublicKey();
      return () -> key;
    }

    private static List<X509Certificate> collectCertificates(KeyInfo keyInfo) {
      List<X509Certificate> shown = new ArrayList<>();
      for (XMLStructure structure : keyInfo.getContent()) {
        if (structure instanceof X509Data data) {
          for (Object content : data.getContent()) {
            if (content instanceof X509Certificate certificate) {
              shown.add(certificate);
            }
          }
        }
      }
      return shown;
    }

    private void requireChain(List<X509Certificate> shown) throws GeneralSecurityException {
      if (shown.get(0).equals(trusted)) {
        trusted.checkValidity();
        return;
      }
      List<X509Certificate> path = shown.stream().filter(one -> !one.equals(trusted)).toList();
      validator.validate(factory.generateCertPath(path), parameters);
    }
  }

  private final String groupAttribute;
  private final XMLSignatureFactory signatures = XMLSignatureFactory.getInstance("DOM");
  private final DocumentBuilderFactory documents = DocumentBuilderFactory.newInstance();
  private final List<KeySelector> selectors = new ArrayList<>();

  private JavaDsig(String groupAttribute, List<String> trusted) throws Exception {
    this.groupAttribute = groupAttribute;
    documents.setNamespaceAware(true);
    documents.setFeature("http://apache.org/xml/features/disallow-doctype-decl", true);
    CertificateFactory factory = CertificateFactory.getInstance("X.509");
    for (String path : trusted) {
      try (InputStream file = Files.newInputStream(Path.of(path))) {
        selectors.add(
            new TrustedKeySelector((X509Certificate) factory.generateCertificate(file), factory));
      }
    }
  }

  private static void require(boolean holds, String what) {
    if (!holds) {
      throw new IllegalArgumentException(what);
    }
  }

  /** The first child element of that name, or null. */
  private static Element findChild(Node parent, String namespace, String name) {
    for (Node node = parent.getFirstChild(); node != null; node = node.getNextSibling()) {
      if (isNamed(node, namespace, name)) {
        return (Element) node;
      }
    }
    return null;
  }

  private static boolean isNamed(Node node, String namespace, String name) {
    return node instanceof Element
        && name.equals(node.getLocalName())
        && namespace.equals(node.getNamespaceURI());
  }

  private Findings validate(byte[] text, int which) throws Exception {
    var builder = documents.newDocumentBuilder();
    builder.setErrorHandler(null);
    Element assertion = builder.parse(new ByteArrayInputStream(text)).getDocumentElement();
    require(isNamed(assertion, SAML, "Assertion"), "not an assertion");
    Element element = findChild(assertion, XMLSignature.XMLNS, "Signature");
    require(element != null, "no signature");
    DOMValidateContext context = new DOMValidateContext(selectors.get(which), element);
    context.setIdAttributeNS(assertion, null, "ID");
    XMLSignature signature = signatures.unmarshalXMLSignature(context);
    require(signature.validate(context), "the signature does not verify");
    List<Reference> references = signature.getSignedInfo().getReferences();
    require(
        references.size() == 1
            && references.get(0).getURI().equals("#" + assertion.getAttribute("ID")),
        "a reference to something else");
    return readFindings(assertion);
  }

  private Findings readFindings(Element assertion) {
    Element name = findChild(findChild(assertion, SAML, "Subject"), SAML, "NameID");
    List<String> groups = new ArrayList<>();
    Node statement = findChild(assertion, SAML, "AttributeStatement");
    for (Node node = statement.getFirstChild(); node != null; node = node.getNextSibling()) {
      if (isNamed(node, SAML, "Attribute")
          && ((Element) node).getAttribute("Name").equals(groupAttribute)) {
        for (Node value = node.getFirstChild(); value != null; value = value.getNextSibling()) {
          if (isNamed(value, SAML, "AttributeValue")) {
            groups.add(value.getTextContent());
          }
        }
      }
    }
    return new Findings(name.getTextContent(), groups);
  }

  private String check(String path, int which) throws IOException {
    byte[] text = Files.readAllBytes(Path.of(path));
    try {
      Findings findings = validate(text, which);
      return "accepted " + findings.subject() + " " + findings.groups().size();
    } catch (Exception e) {
      return "refused " + e.toString().lines().findFirst().orElse("");
    }
  }

  private void run(byte[] token, int which, int calls) throws Exception {
    for (int i = 0; i < calls; i++) {
      validate(token, which);
    }
  }

  public static void main(String[] arguments) throws Exception {
    List<byte[]> tokens = new ArrayList<>();
    List<String> trusted = new ArrayList<>();
    for (int i = 1; i + 1 < arguments.length; i += 2) {
      tokens.add(Files.readAllBytes(Path.of(arguments[i])));
      trusted.add(arguments[i + 1]);
    }
    JavaDsig peer = new JavaDsig(arguments[0], trusted);
    System.out.println("ready Java " + System.getProperty("java.version"));
    BufferedReader orders = new BufferedReader(new InputStreamReader(System.in));
    for (String line = orders.readLine(); line != null; line = orders.readLine()) {
      String[] words = line.split(" ");
      int which = Integer.parseInt(words[1]);
      if (words[0].equals("check")) {
        System.out.println(peer.check(words[2], which));
      } else {
        peer.run(tokens.get(which), which, Integer.parseInt(words[2]));
        System.out.println("done");
      }
    }
  }
}
