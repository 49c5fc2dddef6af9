// SPDX-License-Identifier: Apache-2.0
//
// Undo, redo, and what is saved.

import { EditHistory } from "../../../../client/src/ui/map/edit_history";

describe("the steps of an editor", () => {
  it("lead back and forth, and know what is saved", () => {
    const history = new EditHistory("a");
    const facts = () => [history.current, history.canUndo, history.canRedo, history.isChanged];
    history.undo();
    history.redo();
    expect(facts()).toEqual(["a", false, false, false]);
    history.add("b");
    history.add("c");
    history.markSaved("b");
    expect(facts()).toEqual(["c", true, false, true]);
    history.undo();
    expect(facts()).toEqual(["b", true, true, false]);
    history.undo();
    history.add("d");
    expect(facts()).toEqual(["d", true, false, true]);
    history.undo();
    expect(history.current).toBe("a");
    for (let step = 0; step < 1000; step += 1) history.add(`${step}`);
    for (let step = 0; step < 1000; step += 1) history.undo();
    expect(history.current).toBe("800");
  });
});
