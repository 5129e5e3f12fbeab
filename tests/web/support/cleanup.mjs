// Work to undo when a test ends, undone in reverse order (the browser closes
// before the server it talks to stops), whether the test passed or not.

const stacks = new WeakMap();

export function atTestEnd(t, undo) {
  let stack = stacks.get(t);
  if (stack === undefined) {
    stack = [];
    stacks.set(t, stack);
    t.after(async () => {
      while (stack.length > 0) await stack.pop()();
    });
  }
  stack.push(undo);
}
