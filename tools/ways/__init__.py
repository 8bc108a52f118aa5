"""The ways of the tour by name, in the order in which they are gone: (function, what the person's device is made with)."""

from ways import (boot, canary, interrupted, keys, later, many, notifications, opening, settings, signin, uploads, waiting,
                  window)

WAYS = (uploads.WAYS | later.WAYS | waiting.WAYS | opening.WAYS | notifications.WAYS | many.WAYS | window.WAYS | keys.WAYS
        | signin.WAYS | settings.WAYS | boot.WAYS | interrupted.WAYS | canary.WAYS)

# Too long for every run: these are gone when they are asked for by name.
ON_DEMAND = {"hundred-thousand", "signin-thirty", "removal-killed", "interrupted-200"}
