import java.io.StringReader;
import java.nio.file.Files;
import java.nio.file.Path;
import java.security.cert.CertificateFactory;
import java.security.cert.X509Certificate;
import java.util.ArrayList;
import java.util.List;

import javax.crypto.KeyGenerator;

import net.shibboleth.utilities.java.support.xml.BasicParserPool;
import net.shibboleth.utilities.java.support.xml.SerializeSupport;

import org.apache.wss4j.common.saml.OpenSAMLUtil;
import org.opensaml.core.xml.util.XMLObjectSupport;
import org.opensaml.saml.saml2.core.Assertion;
import org.opensaml.saml.saml2.encryption.Encrypter;
import org.opensaml.security.credential.BasicCredential;
import org.opensaml.security.x509.BasicX509Credential;
import org.opensaml.xmlsec.encryption.support.DataEncryptionParameters;
import org.opensaml.xmlsec.encryption.support.KeyEncryptionParameters;
import org.opensaml.xmlsec.encryption.support.RSAOAEPParameters;
import org.opensaml.xmlsec.keyinfo.impl.BasicKeyInfoGeneratorFactory;
import org.opensaml.xmlsec.keyinfo.impl.X509KeyInfoGeneratorFactory;

/**
 * Lets OpenSAML encrypt a signed assertion. Arguments: the file, the algorithms of the content and
 * of its key, the digest and the mask of RSA-OAEP (`-` for none), where the key is to stand (INLINE
 * or PEER), and the certificates of those who may read it. Writes to standard output.
 */
public class EncryptAssertion {
    public static void main(String[] arguments) throws Exception {
        OpenSAMLUtil.initSamlEngine();
        BasicParserPool pool = new BasicParserPool();
        pool.initialize();
        Assertion assertion = (Assertion) XMLObjectSupport.unmarshallFromReader(
            pool, new StringReader(Files.readString(Path.of(arguments[0]))));

        DataEncryptionParameters content = new DataEncryptionParameters();
        content.setAlgorithm(arguments[1]);
        KeyGenerator generator = KeyGenerator.getInstance("AES");
        generator.init(Integer.parseInt(arguments[1].replaceAll(".*#aes([0-9]+).*", "$1")));
        BasicCredential contentKey = new BasicCredential(generator.generateKey());
        contentKey.getKeyNames().add("content"); // which OpenSAML links several keys with
        content.setEncryptionCredential(contentKey);
        BasicKeyInfoGeneratorFactory name = new BasicKeyInfoGeneratorFactory();
        name.setEmitKeyNames(true);
        content.setKeyInfoGenerator(name.newInstance());
        List<KeyEncryptionParameters> keys = new ArrayList<>();
        for (int i = 6; i < arguments.length; ++i) {
            keys.add(makeKey(arguments[i], arguments));
        }
        Encrypter encrypter = new Encrypter(content, keys);
        encrypter.setKeyPlacement(Encrypter.KeyPlacement.valueOf(arguments[5]));
        System.out.print(SerializeSupport.nodeToString(
            XMLObjectSupport.marshall(encrypter.encrypt(assertion))));
    }

    private static KeyEncryptionParameters makeKey(String certificate, String[] arguments)
        throws Exception {
        KeyEncryptionParameters key = new KeyEncryptionParameters();
        key.setAlgorithm(arguments[2]);
        key.setEncryptionCredential(new BasicX509Credential(readCertificate(certificate)));
        key.setRecipient("https://" + Path.of(certificate).getFileName() + ".example.com/entity");
        if (!arguments[3].equals("-")) {
            key.setRSAOAEPParameters(new RSAOAEPParameters(
                arguments[3], arguments[4].equals("-") ? null : arguments[4], null));
        }
        X509KeyInfoGeneratorFactory keyInfo = new X509KeyInfoGeneratorFactory();
        keyInfo.setEmitEntityCertificate(true);
        key.setKeyInfoGenerator(keyInfo.newInstance());
        return key;
    }

    private static X509Certificate readCertificate(String file) throws Exception {
        try (var in = Files.newInputStream(Path.of(file))) {
            return (X509Certificate) CertificateFactory.getInstance("X.509").generateCertificate(in);
        }
    }
}
