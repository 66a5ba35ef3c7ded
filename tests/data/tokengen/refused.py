def add_all(catalogue):
    pass
