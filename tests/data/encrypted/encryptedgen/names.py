"""Namespaces and identifiers of the documents."""

SAML = "urn:oasis:names:tc:SAML:2.0:assertion"
DS = "http://www.w3.org/2000/09/xmldsig#"
XENC = "http://www.w3.org/2001/04/xmlenc#"
XENC11 = "http://www.w3.org/2009/xmlenc11#"
WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"

ELEMENT = XENC + "Element"
CONTENT = XENC + "Content"
KEY_TYPE = XENC + "EncryptedKey"

AES_KW = XENC + "kw-aes256"
RSA_1_5 = XENC + "rsa-1_5"
OAEP_MGF1P = XENC + "rsa-oaep-mgf1p"
OAEP = XENC11 + "rsa-oaep"

MD5 = "http://www.w3.org/2001/04/xmldsig-more#md5"
SHA1 = DS + "sha1"
SHA256 = XENC + "sha256"
SHA384 = "http://www.w3.org/2001/04/xmldsig-more#sha384"
SHA384_OF_XENC = XENC + "sha384"
SHA512 = XENC + "sha512"


def gcm(bits):
    return f"{XENC11}aes{bits}-gcm"


def cbc(bits):
    return f"{XENC}aes{bits}-cbc"


def mgf(name):
    return f"{XENC11}mgf1{name}"
