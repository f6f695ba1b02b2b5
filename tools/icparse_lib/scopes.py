"""Names and what they stand for."""


class EnumConstant:
    def __init__(self, value, type_):
        self.value, self.type = value, type_


class Scope:
    """One block's identifiers and tags."""

    def __init__(self, block=None):
        self.names, self.tags, self.block = {}, {}, block


class Scopes:
    """The stack of scopes; the first is the file's. An identifier is a Symbol, an EnumConstant or a Typedef type."""

    def __init__(self):
        self.stack = [Scope()]

    @property
    def at_file_scope(self):
        return len(self.stack) == 1

    @property
    def current(self):
        return self.stack[-1]

    def push(self, block=None):
        self.stack.append(Scope(block))

    def pop(self):
        self.stack.pop()

    def find(self, name):
        for scope in reversed(self.stack):
            if name in scope.names:
                return scope.names[name]
        return None

    def find_here(self, name):
        return self.current.names.get(name)

    def find_tag(self, name, here=False):
        for scope in [self.current] if here else reversed(self.stack):
            if name in scope.tags:
                return scope.tags[name]
        return None

    def enter(self, name, thing):
        self.current.names[name] = thing

    def enter_tag(self, name, type_):
        self.current.tags[name] = type_
