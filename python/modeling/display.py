"""What geometry looks like at a prompt and in a notebook."""

from __future__ import annotations

from html import escape

from . import _modeling

_MOST_NAMES = 20


def text(geometry: _modeling.Geometry) -> str:
    """`<modeling.Mesh: 8 points, 6 faces, 24 corners; points: w (float)>`"""
    parts = [", ".join(f"{count:,} {name}" for name, count in geometry.components.items())]
    parts += [f"{target}: {', '.join(names)}" for target, names in _properties(geometry).items()]
    return _printable(f"<modeling.{type(geometry).__name__}: {'; '.join(parts)}>")


def html(geometry: _modeling.Geometry) -> str:
    """A table with a row per component and range."""
    rows = [(name, f"{count:,}") for name, count in geometry.components.items()]
    rows += [(name, f"range of {geometry.ranges[name].target}") for name in geometry.ranges]
    properties = _properties(geometry)
    cells = "".join(
        f"<tr><td>{_safe(name)}</td><td>{_safe(count)}</td><td>{_safe(', '.join(properties.get(name, [])))}</td></tr>"
        for name, count in rows
    )
    return (
        f"<table><caption>modeling.{_safe(type(geometry).__name__)}</caption>"
        f"<tr><th>elements</th><th>count</th><th>properties</th></tr>{cells}</table>"
    )


def _printable(text: str) -> str:
    """Names may have bytes that are not UTF-8, which cannot be displayed."""
    return text.encode("utf-8", "replace").decode()


def _safe(text: str) -> str:
    return escape(_printable(text))


def _properties(geometry: _modeling.Geometry) -> dict[str, list[str]]:
    result = {}
    for target in [*geometry.components, *geometry.ranges]:
        data = geometry.data(target)
        names = [f"{name} ({data.info(name).type})" for name in list(data)[:_MOST_NAMES]]
        if len(data) > _MOST_NAMES:
            names.append(f"and {len(data) - _MOST_NAMES} more")
        if names:
            result[target] = names
    return result
