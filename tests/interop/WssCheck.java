import java.io.ByteArrayInputStream;
import java.io.FileInputStream;
import java.io.InputStream;
import java.nio.file.Path;
import java.security.KeyStore;
import java.security.cert.CertificateFactory;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.Base64;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import java.util.Set;
import javax.security.auth.callback.Callback;
import javax.xml.namespace.QName;
import javax.xml.parsers.DocumentBuilderFactory;
import org.apache.ws.security.WSConstants;
import org.apache.ws.security.WSDataRef;
import org.apache.ws.security.WSDocInfo;
import org.apache.ws.security.WSPasswordCallback;
import org.apache.ws.security.WSSConfig;
import org.apache.ws.security.WSSecurityEngine;
import org.apache.ws.security.WSSecurityEngineResult;
import org.apache.ws.security.WSSecurityException;
import org.apache.ws.security.components.crypto.AlgorithmSuite;
import org.apache.ws.security.components.crypto.Crypto;
import org.apache.ws.security.components.crypto.Merlin;
import org.apache.ws.security.handler.RequestData;
import org.apache.ws.security.message.token.SecurityTokenReference;
import org.apache.ws.security.processor.Processor;
import org.apache.ws.security.str.STRParser.REFERENCE_TYPE;
import org.apache.ws.security.util.WSSecurityUtil;
import org.w3c.dom.Document;
import org.w3c.dom.Element;

/**
 * Has WSS4J process the security header of signed requests: WssCheck CERTIFICATE FILE...
 *
 * Says of each file, in a line of its own, "NAME accepted by REFERENCE" or "NAME refused: WHY".
 * Only the holder of the certificate may have signed.
 */
public final class WssCheck {
    private static final String EXC_C14N = "http://www.w3.org/2001/10/xml-exc-c14n#";
    private static final String RSA_SHA256 = "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256";
    private static final String SHA256 = "http://www.w3.org/2001/04/xmlenc#sha256";
    private static final String SAML_ID =
        "http://docs.oasis-open.org/wss/oasis-wss-saml-token-profile-1.1#SAMLID";
    // Without the hyphen, for the profile spells its name in two ways; WSS4J has a constant of the
    // other one, with which it compares only under the rules of the basic security profile.
    private static final String SAML_2 =
        "http://docs.oasis-open.org/wss/oasis-wss-saml-tokenprofile-1.1#SAMLV2.0";

    public static void main(String[] arguments) throws Exception {
        WSSConfig.init();
        Crypto trust = trustOnly(readCertificate(arguments[0]));
        for (int i = 1; i < arguments.length; ++i) {
            String verdict;
            try {
                verdict = "accepted by " + check(parse(arguments[i]), trust);
            } catch (WSSecurityException | Refusal refusal) {
                verdict = "refused: " + refusal.getMessage();
            }
            System.out.println(Path.of(arguments[i]).getFileName() + " " + verdict);
        }
    }

    private static final class Refusal extends Exception {
        private static final long serialVersionUID = 1;

        Refusal(String message) {
            super(message);
        }
    }

    private static void require(boolean condition, String complaint) throws Refusal {
        if (!condition) {
            throw new Refusal(complaint);
        }
    }

    private static X509Certificate readCertificate(String file) throws Exception {
        try (InputStream stream = new FileInputStream(file)) {
            return (X509Certificate)
                CertificateFactory.getInstance("X.509").generateCertificate(stream);
        }
    }

    private static Crypto trustOnly(X509Certificate certificate) throws Exception {
        KeyStore store = KeyStore.getInstance(KeyStore.getDefaultType());
        store.load(null, null);
        store.setCertificateEntry("trusted", certificate);
        Merlin crypto = new Merlin();
        crypto.setKeyStore(store);
        return crypto;
    }

    private static Document parse(String file) throws Exception {
        DocumentBuilderFactory factory = DocumentBuilderFactory.newInstance();
        factory.setNamespaceAware(true);
        return factory.newDocumentBuilder().parse(file);
    }

    /** Gives the kind of reference by which the signature names its key. */
    private static REFERENCE_TYPE check(Document document, Crypto trust) throws Exception {
        Element envelope = document.getDocumentElement();
        Element security = WSSecurityUtil.getSecurityHeader(document, "");
        boolean hasAssertion =
            child(security, "urn:oasis:names:tc:SAML:2.0:assertion", "Assertion") != null;
        Map<Integer, WSSecurityEngineResult> results = process(security, trust, hasAssertion);

        require(results.containsKey(WSConstants.TS), "no timestamp");
        WSSecurityEngineResult signature = results.get(WSConstants.SIGN);
        require(signature != null, "no signature");
        requireSigned(signature, Set.of(
            child(envelope, WSConstants.URI_SOAP11_ENV, "Body"),
            child(security, WSConstants.WSU_NS, "Timestamp")));
        if (hasAssertion) {
            requireSamlReference(security);
        }
        return (REFERENCE_TYPE) signature.get(WSSecurityEngineResult.TAG_X509_REFERENCE_TYPE);
    }

    private static Map<Integer, WSSecurityEngineResult> process(
            Element security, Crypto trust, boolean hasAssertion) throws Exception {
        WSSConfig config = WSSConfig.getNewInstance();
        config.setProcessor(WSSecurityEngine.SAML2_TOKEN, new HolderOfKeyAssertion());
        // The rules of the basic security profile would be asked of a binary token, which is what
        // HolderOfKeyAssertion makes an assertion look like.
        config.setWsiBSPCompliant(!hasAssertion);

        RequestData request = new RequestData();
        request.setWssConfig(config);
        request.setSigCrypto(trust);
        request.setAlgorithmSuite(onlyOurAlgorithms());
        request.setCallbackHandler(WssCheck::givePassword);
        WSSecurityEngine engine = new WSSecurityEngine();
        engine.setWssConfig(config);

        Map<Integer, WSSecurityEngineResult> results = new HashMap<>();
        for (WSSecurityEngineResult result : engine.processSecurityHeader(security, request)) {
            Integer action = (Integer) result.get(WSSecurityEngineResult.TAG_ACTION);
            require(results.put(action, result) == null, "more than one of a kind");
        }
        return results;
    }

    private static AlgorithmSuite onlyOurAlgorithms() {
        AlgorithmSuite suite = new AlgorithmSuite();
        suite.addSignatureMethod(RSA_SHA256);
        suite.addC14nAlgorithm(EXC_C14N);
        suite.addDigestAlgorithm(SHA256);
        suite.addTransformAlgorithm(EXC_C14N);
        suite.setMinimumAsymmetricKeyLength(2048);
        return suite;
    }

    private static void givePassword(Callback[] callbacks) {
        for (Callback callback : callbacks) {
            ((WSPasswordCallback) callback).setPassword("s3cret");
        }
    }

    private static void requireSigned(WSSecurityEngineResult signature, Set<Element> expected)
            throws Refusal {
        List<Element> actual = new ArrayList<>();
        for (Object reference
                : (List<?>) signature.get(WSSecurityEngineResult.TAG_DATA_REF_URIS)) {
            actual.add(((WSDataRef) reference).getProtectedElement());
        }
        require(actual.size() == expected.size() && expected.equals(Set.copyOf(actual)),
            "signed is something other than body and timestamp");
    }

    private static void requireSamlReference(Element security) throws Exception {
        Element keyInfo = child(
            child(security, WSConstants.SIG_NS, "Signature"), WSConstants.SIG_NS, "KeyInfo");
        SecurityTokenReference reference = new SecurityTokenReference(
            child(keyInfo, WSConstants.WSSE_NS, "SecurityTokenReference"));
        require(SAML_ID.equals(reference.getKeyIdentifierValueType()), "not the ID of an assertion");
        require(SAML_2.equals(reference.getTokenType()), "not a SAML 2.0 token");
    }

    private static Element child(Element parent, String namespace, String name) {
        return WSSecurityUtil.getDirectChildElement(parent, name, namespace);
    }

    /**
     * Reads the holder's certificate from an assertion, which the distribution's WSS4J cannot, as
     * it is built without SAML. It offers the certificate under the assertion's ID, as WSS4J does
     * with a binary token; that the key identifier leads there, and the signature to that
     * certificate, is left to WSS4J. The assertion's own signature is not looked at.
     */
    private static final class HolderOfKeyAssertion implements Processor {
        @Override
        public List<WSSecurityEngineResult> handleToken(
                Element assertion, RequestData request, WSDocInfo document)
                throws WSSecurityException {
            WSSecurityEngineResult result = new WSSecurityEngineResult(WSConstants.BST);
            result.put(WSSecurityEngineResult.TAG_X509_CERTIFICATES,
                holderOf(assertion, request.getSigCrypto()));
            result.put(WSSecurityEngineResult.TAG_VALIDATED_TOKEN, false);
            result.put(WSSecurityEngineResult.TAG_ID, assertion.getAttribute("ID"));
            document.addTokenElement(assertion, false);
            document.addResult(result);
            return List.of(result);
        }

        private static X509Certificate[] holderOf(Element assertion, Crypto crypto)
                throws WSSecurityException {
            Element certificate = assertion;
            for (QName name : PATH) {
                certificate = child(certificate, name.getNamespaceURI(), name.getLocalPart());
                if (certificate == null) {
                    throw new WSSecurityException("the assertion names no holder of a key");
                }
            }
            byte[] bytes = Base64.getMimeDecoder().decode(certificate.getTextContent());
            return new X509Certificate[] {
                crypto.loadCertificate(new ByteArrayInputStream(bytes))};
        }

        private static final String SAML = "urn:oasis:names:tc:SAML:2.0:assertion";
        private static final List<QName> PATH = List.of(
            new QName(SAML, "Subject"),
            new QName(SAML, "SubjectConfirmation"),
            new QName(SAML, "SubjectConfirmationData"),
            new QName(WSConstants.SIG_NS, "KeyInfo"),
            new QName(WSConstants.SIG_NS, "X509Data"),
            new QName(WSConstants.SIG_NS, "X509Certificate"));
    }
}
