"""The host's side of the lab: builds kernel and disk, boots guests and collects their results."""
