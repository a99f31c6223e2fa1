// What the document is, and how it is shown.

// The explanations of a fleet, unpacked a block at a time, when one is asked for.
class Blocks {
  constructor() {
    this.texts = [...document.querySelectorAll("script.block")];
    this.unpacked = new Map();
  }

  async at(block, index) {
    if (!this.unpacked.has(block)) this.unpacked.set(block, unpack(this.texts[block].textContent));
    return (await this.unpacked.get(block))[index];
  }
}

function unpack(base64) {
  const bytes = Uint8Array.from(atob(base64), (character) => character.charCodeAt(0));
  return new Response(new Blob([bytes]).stream().pipeThrough(new DecompressionStream("deflate"))).json();
}

// Opens what the run would do to a device, above the page.
function opener(fleet) {
  const blocks = new Blocks();
  const content = element("div", {});
  const dialog = element("dialog", { "aria-labelledby": "device" },
    element("button", { type: "button", class: "button close", click: () => dialog.close() }, "Close"), content);
  document.body.append(dialog);
  return async (index) => {
    const { name, verdict, detail, block } = fleet.devices;
    const why = detail[index] ? element("p", {}, detail[index]) : null;
    const told = block[index] ? await blocks.at(...block[index]) : null;
    content.replaceChildren(element("h2", { id: "device" }, name[index]), told && told.explanation
      ? deviceView(told.explanation, told.console)
      : element("div", {}, element("p", { class: `verdict ${tone(verdict[index])} mark` }, VERDICTS[verdict[index]]), why,
        consoleOf(told ? told.console : [], 2)));
    dialog.showModal();
    dialog.scrollTop = 0;
  };
}

// The document: as JSON, or packed like the blocks.
function documentOfPage() {
  const text = document.getElementById("document").textContent.trim();
  return text.startsWith("{") ? JSON.parse(text) : unpack(text);
}

async function start() {
  const shown = await documentOfPage();
  const main = document.getElementById("content");
  if (shown.fleet) {
    document.title = `Rehearsal of release ${shown.fleet.release}`;
    main.replaceChildren(...fleetView(shown.fleet, opener(shown.fleet)).filter(Boolean));
  } else {
    document.title = shown.rehearsal ? "What a run would do to the accounts" : "What the run did to the accounts";
    main.replaceChildren(element("h1", {}, document.title), deviceView(shown, shown.console || [], 1));
  }
}

start();
