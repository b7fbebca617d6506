"""The host's side of the lab: builds what a guest is made of, boots guests and collects their results."""
