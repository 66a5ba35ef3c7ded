import java.io.File;
import java.io.FileInputStream;
import java.io.InputStream;
import java.nio.file.Path;
import java.security.KeyStore;
import java.util.HashMap;
import java.util.List;
import java.util.Map;
import java.util.Properties;
import javax.net.ssl.KeyManagerFactory;
import javax.security.auth.callback.Callback;
import javax.security.auth.callback.CallbackHandler;
import javax.xml.parsers.DocumentBuilderFactory;
import javax.xml.ws.soap.SOAPBinding;
import org.apache.cxf.Bus;
import org.apache.cxf.BusFactory;
import org.apache.cxf.configuration.jsse.TLSServerParameters;
import org.apache.cxf.jaxws.EndpointImpl;
import org.apache.cxf.sts.StaticSTSProperties;
import org.apache.cxf.sts.claims.ClaimsManager;
import org.apache.cxf.sts.claims.StaticClaimsHandler;
import org.apache.cxf.sts.operation.TokenIssueOperation;
import org.apache.cxf.sts.operation.TokenRenewOperation;
import org.apache.cxf.sts.operation.TokenValidateOperation;
import org.apache.cxf.sts.token.delegation.SAMLDelegationHandler;
import org.apache.cxf.sts.token.provider.SAMLTokenProvider;
import org.apache.cxf.sts.token.renewer.SAMLTokenRenewer;
import org.apache.cxf.sts.token.validator.SAMLTokenValidator;
import org.apache.cxf.transport.http_jetty.JettyHTTPServerEngineFactory;
import org.apache.cxf.ws.policy.WSPolicyFeature;
import org.apache.cxf.ws.security.sts.provider.SecurityTokenServiceProvider;
import org.apache.cxf.ws.security.tokenstore.MemoryTokenStore;
import org.apache.cxf.ws.security.tokenstore.TokenStore;
import org.apache.cxf.ws.security.wss4j.WSS4JInInterceptor;
import org.apache.wss4j.common.ext.WSPasswordCallback;
import org.w3c.dom.Element;

/**
 * Apache CXF's token service on loopback, with stock settings, until standard input ends: StsServer
 * FOLDER PORT POLICIES.
 *
 * The folder has the key stores tls.p12, sts.p12 (the key that signs tokens, and the certificates
 * that tokens may be bound to) and trust.p12 (the certificates that may sign requests). Below
 * https://localhost:PORT/11/ and /12/, for SOAP 1.1 and 1.2, is an endpoint for each kind of
 * credentials; below /policy/11/ and /policy/12/ one that has a WS-SecurityPolicy instead, from the
 * folder POLICIES. Writes "ready" when all of them can be called.
 */
public final class StsServer {
    private static final String PASSWORD = "changeit";
    private static final Map<String, String> USERS = Map.of("alice", "secret", "sts", PASSWORD);

    // What each endpoint finds in the security header, in WSS4J's words.
    private static final Map<String, String> ENDPOINTS = Map.of(
        "password", "UsernameToken Timestamp",
        "certificate", "Signature Timestamp",
        "password-and-certificate", "UsernameToken Timestamp Signature",
        "token", "SAMLTokenSigned Timestamp Signature");

    private final Path folder;
    private final int port;
    private final Path policies;
    private final Bus bus = BusFactory.getDefaultBus();

    private StsServer(Path folder, int port, Path policies) {
        this.folder = folder;
        this.port = port;
        this.policies = policies;
    }

    public static void main(String[] arguments) throws Exception {
        new StsServer(
            Path.of(arguments[0]), Integer.parseInt(arguments[1]), Path.of(arguments[2])).publish();
        System.out.println("ready");
        while (System.in.read() >= 0) {
            continue;
        }
        System.exit(0);
    }

    private void publish() throws Exception {
        TLSServerParameters tls = new TLSServerParameters();
        tls.setKeyManagers(readTlsKey().getKeyManagers());
        bus.getExtension(JettyHTTPServerEngineFactory.class)
            .setTLSServerParametersForPort("localhost", port, tls);
        SecurityTokenServiceProvider service = createService();
        for (Map.Entry<String, String> endpoint : ENDPOINTS.entrySet()) {
            String name = endpoint.getKey();
            publish(service, SOAPBinding.SOAP11HTTP_BINDING, "11/" + name, endpoint.getValue());
            publish(service, SOAPBinding.SOAP12HTTP_BINDING, "12/" + name, endpoint.getValue());
        }
        for (File policy : policies.toFile().listFiles()) {
            String name = policy.getName().replace(".xml", "");
            publish(service, SOAPBinding.SOAP11HTTP_BINDING, "policy/11/" + name, policy);
            publish(service, SOAPBinding.SOAP12HTTP_BINDING, "policy/12/" + name, policy);
        }
    }

    private void publish(
            SecurityTokenServiceProvider service, String binding, String path, String actions) {
        Map<String, Object> properties = new HashMap<>();
        properties.put("action", actions);
        properties.put("passwordCallbackRef", (CallbackHandler) StsServer::givePassword);
        properties.put("signaturePropRefId", "trusted");
        properties.put("trusted", readStore("trust.p12"));
        EndpointImpl endpoint = new EndpointImpl(bus, service, binding);
        endpoint.getInInterceptors().add(new WSS4JInInterceptor(properties));
        endpoint.publish("https://localhost:" + port + "/" + path);
    }

    private void publish(
            SecurityTokenServiceProvider service, String binding, String path, File policy)
            throws Exception {
        WSPolicyFeature feature = new WSPolicyFeature();
        feature.setPolicyElements(List.of(readXml(policy)));
        Map<String, Object> properties = new HashMap<>();
        properties.put("security.callback-handler", (CallbackHandler) StsServer::givePassword);
        properties.put("security.signature.properties", readStore("sts.p12"));
        properties.put("security.signature.username", "sts");
        properties.put("security.encryption.properties", readStore("trust.p12"));
        // What the suites of WS-SecurityPolicy mean without it is RSA-SHA1.
        properties.put(
            "ws-security.asymmetric.signature.algorithm",
            "http://www.w3.org/2001/04/xmldsig-more#rsa-sha256");
        EndpointImpl endpoint = new EndpointImpl(bus, service, binding);
        endpoint.getFeatures().add(feature);
        endpoint.setProperties(properties);
        endpoint.publish("https://localhost:" + port + "/" + path);
    }

    private static Element readXml(File file) throws Exception {
        DocumentBuilderFactory factory = DocumentBuilderFactory.newInstance();
        factory.setNamespaceAware(true);
        return factory.newDocumentBuilder().parse(file).getDocumentElement();
    }

    private KeyManagerFactory readTlsKey() throws Exception {
        KeyStore store = KeyStore.getInstance("PKCS12");
        try (InputStream stream = new FileInputStream(folder.resolve("tls.p12").toFile())) {
            store.load(stream, PASSWORD.toCharArray());
        }
        KeyManagerFactory keys =
            KeyManagerFactory.getInstance(KeyManagerFactory.getDefaultAlgorithm());
        keys.init(store, PASSWORD.toCharArray());
        return keys;
    }

    private Properties readStore(String file) {
        String merlin = "org.apache.wss4j.crypto.merlin.keystore.";
        Properties store = new Properties();
        store.setProperty("org.apache.wss4j.crypto.provider",
            "org.apache.wss4j.common.crypto.Merlin");
        store.setProperty(merlin + "type", "PKCS12");
        store.setProperty(merlin + "password", PASSWORD);
        store.setProperty(merlin + "file", folder.resolve(file).toString());
        return store;
    }

    private static void givePassword(Callback[] callbacks) {
        for (Callback callback : callbacks) {
            WSPasswordCallback password = (WSPasswordCallback) callback;
            password.setPassword(USERS.get(password.getIdentifier()));
        }
    }

    private static ClaimsManager createClaims() {
        StaticClaimsHandler handler = new StaticClaimsHandler();
        handler.setGlobalClaims(Map.of("urn:claim", "claimed"));
        ClaimsManager claims = new ClaimsManager();
        claims.setClaimHandlers(List.of(handler));
        return claims;
    }

    private SecurityTokenServiceProvider createService() throws Exception {
        StaticSTSProperties settings = new StaticSTSProperties();
        settings.setSignatureCryptoProperties(readStore("sts.p12"));
        settings.setSignatureUsername("sts");
        settings.setCallbackHandler(StsServer::givePassword);
        settings.setIssuer("https://localhost/sts");
        settings.configureProperties();

        TokenStore tokens = new MemoryTokenStore();
        SAMLTokenProvider provider = new SAMLTokenProvider();
        SAMLTokenValidator validator = new SAMLTokenValidator();
        SecurityTokenServiceProvider service = new SecurityTokenServiceProvider();

        TokenIssueOperation issue = new TokenIssueOperation();
        issue.setStsProperties(settings);
        issue.setTokenStore(tokens);
        issue.setTokenProviders(List.of(provider));
        issue.setTokenValidators(List.of(validator));
        issue.setClaimsManager(createClaims());
        issue.setDelegationHandlers(List.of(new SAMLDelegationHandler()));
        service.setIssueOperation(issue);

        TokenValidateOperation validate = new TokenValidateOperation();
        validate.setStsProperties(settings);
        validate.setTokenStore(tokens);
        validate.setTokenProviders(List.of(provider));
        validate.setTokenValidators(List.of(validator));
        service.setValidateOperation(validate);

        TokenRenewOperation renew = new TokenRenewOperation();
        renew.setStsProperties(settings);
        renew.setTokenStore(tokens);
        renew.setTokenRenewers(List.of(new SAMLTokenRenewer()));
        renew.setTokenValidators(List.of(validator));
        service.setRenewOperation(renew);
        return service;
    }
}
