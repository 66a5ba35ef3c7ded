import java.io.StringReader;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.KeyFactory;
import java.security.PrivateKey;
import java.security.Security;
import java.security.cert.CertificateFactory;
import java.security.cert.X509Certificate;
import java.security.spec.PKCS8EncodedKeySpec;
import java.util.Base64;

import net.shibboleth.utilities.java.support.xml.BasicParserPool;
import net.shibboleth.utilities.java.support.xml.SerializeSupport;

import org.apache.wss4j.common.saml.OpenSAMLUtil;
import org.bouncycastle.jce.provider.BouncyCastleProvider;
import org.opensaml.core.xml.util.XMLObjectSupport;
import org.opensaml.saml.common.SAMLObjectContentReference;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.security.x509.BasicX509Credential;
import org.opensaml.xmlsec.keyinfo.impl.X509KeyInfoGeneratorFactory;
import org.opensaml.xmlsec.signature.Signature;
import org.opensaml.xmlsec.signature.support.Signer;

/**
 * Reads unsigned assertions as OpenSAML's objects, and lets OpenSAML write and sign them. Each line
 * of the plan has, between tabs: the unsigned file, the signed one, the key's files without
 * `-key.pem` and `-cert.pem`, and the algorithms of signature, digest and canonical form.
 */
public class MakeAssertions {
    public static void main(String[] arguments) throws Exception {
        Security.addProvider(new BouncyCastleProvider()); // Santuario takes RSA-PSS from it
        OpenSAMLUtil.initSamlEngine(); // OpenSAML's own start wants an HTTP client
        for (String line : Files.readAllLines(Path.of(arguments[0]))) {
            String[] plan = line.split("\t");
            Files.writeString(Path.of(plan[1]),
                sign(Files.readString(Path.of(plan[0])), plan[2], plan[3], plan[4], plan[5]));
        }
    }

    private static String sign(
        String xml, String key, String algorithm, String digest, String canonicalForm)
        throws Exception {
        BasicParserPool pool = new BasicParserPool();
        pool.initialize();
        Assertion assertion =
            (Assertion) XMLObjectSupport.unmarshallFromReader(pool, new StringReader(xml));
        assertion.releaseChildrenDOM(true);
        assertion.releaseDOM();

        BasicX509Credential credential =
            new BasicX509Credential(readCertificate(key), readKey(key));
        Signature signature =
            (Signature) XMLObjectSupport.buildXMLObject(Signature.DEFAULT_ELEMENT_NAME);
        signature.setSigningCredential(credential);
        signature.setSignatureAlgorithm(algorithm);
        signature.setCanonicalizationAlgorithm(canonicalForm);
        X509KeyInfoGeneratorFactory keyInfo = new X509KeyInfoGeneratorFactory();
        keyInfo.setEmitEntityCertificate(true);
        signature.setKeyInfo(keyInfo.newInstance().generate(credential));
        assertion.setSignature(signature);
        ((SAMLObjectContentReference) signature.getContentReferences().get(0))
            .setDigestAlgorithm(digest);

        XMLObjectSupport.marshall(assertion);
        Signer.signObject(signature);
        return SerializeSupport.nodeToString(assertion.getDOM());
    }

    private static X509Certificate readCertificate(String key) throws Exception {
        try (var in = Files.newInputStream(Path.of(key + "-cert.pem"))) {
            return (X509Certificate) CertificateFactory.getInstance("X.509").generateCertificate(in);
        }
    }

    private static PrivateKey readKey(String key) throws Exception {
        String pem = Files.readString(Path.of(key + "-key.pem")).replaceAll("-----[A-Z ]+-----", "");
        PKCS8EncodedKeySpec spec = new PKCS8EncodedKeySpec(Base64.getMimeDecoder().decode(pem));
        String type = readCertificate(key).getPublicKey().getAlgorithm();
        return KeyFactory.getInstance(type).generatePrivate(spec);
    }
}
