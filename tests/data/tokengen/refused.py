"""The tokens that must be refused, and how."""

from . import forgery, malformed, parameters, structure


def add_all(catalogue):
    structure.add_all(catalogue)
    forgery.add_all(catalogue)
    parameters.add_all(catalogue)
    malformed.add_all(catalogue)
