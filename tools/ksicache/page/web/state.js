// What is chosen on the page: whoever shows something of it is told when it changes.

export class State {
  constructor(values) {
    this.values = values;
    this.listeners = [];
  }

  get(name) {
    return this.values[name];
  }

  // Calls `listener` after each change of one of `names`.
  watch(names, listener) {
    this.listeners.push({names, listener});
  }

  set(changes) {
    const changed = Object.keys(changes).filter((name) => this.values[name] !== changes[name]);
    Object.assign(this.values, changes);
    for (const {names, listener} of this.listeners) {
      if (names.some((name) => changed.includes(name))) listener();
    }
  }
}
