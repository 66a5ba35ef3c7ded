# The hosts of the identifiers that differ between token services. Every program of the project
# takes them from here.
set(SSOCLIENT_CLAIMS_AUTHORITY "http://schemas.xmlsoap.org" CACHE STRING
    "Authority of the UPN, given-name and surname claim URIs")
set(SSOCLIENT_RSA_AUTHORITY "http://www.rsa.com" CACHE STRING
    "Authority of the RSA extension namespaces and of the group-identity attribute")
set(SSOCLIENT_ISSUER_AUTHORITY "http://sts.example.com" CACHE STRING
    "Authority of the isSolution attribute")

# Gives `target` the three authorities as string macros.
function(ssoclient_use_authorities target)
    target_compile_definitions(${target} PRIVATE
        SSOCLIENT_CLAIMS_AUTHORITY="${SSOCLIENT_CLAIMS_AUTHORITY}"
        SSOCLIENT_RSA_AUTHORITY="${SSOCLIENT_RSA_AUTHORITY}"
        SSOCLIENT_ISSUER_AUTHORITY="${SSOCLIENT_ISSUER_AUTHORITY}")
endfunction()
