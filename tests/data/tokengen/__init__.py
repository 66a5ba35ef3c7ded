"""Makes the signed tokens that the tests read. Nothing here uses the library under test."""
