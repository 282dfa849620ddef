"""The exceptions and warnings of the package."""


class InvalidGeometry(ValueError):
    """Geometry whose standard arrays are missing or do not fit one another. The sentence names array and element."""
