"""The ways of the tour by name, in the order in which they are gone: (function, what the person's device is made with)."""

from ways import keys, later, many, notifications, opening, uploads, waiting

WAYS = uploads.WAYS | later.WAYS | waiting.WAYS | opening.WAYS | notifications.WAYS | many.WAYS | keys.WAYS
