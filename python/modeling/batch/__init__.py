"""Runs one recipe on many files, on this machine or on a Dask cluster: `python3 -m modeling.batch --help`."""
