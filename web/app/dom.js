// The few things that all parts of the page do with its elements.

/**
 * An element of the page by its id.
 *
 * @param {string} id
 * @returns {HTMLElement}
 */
export function byId(id) {
  const element = document.getElementById(id);
  if (!element) {
    throw new Error(`The page has no element “${id}”.`);
  }
  return element;
}

/**
 * A new element. Text is set as text: titles and file names come from anybody.
 *
 * @param {string} name
 * @param {{text?: string, class?: string, [attribute: string]: string}} [settings]
 * @param {...Node} children
 * @returns {HTMLElement}
 */
export function make(name, { text, class: className, ...attributes } = {}, ...children) {
  const element = document.createElement(name);
  if (text !== undefined) {
    element.textContent = text;
  }
  if (className) {
    element.className = className;
  }
  for (const [attribute, value] of Object.entries(attributes)) {
    element.setAttribute(attribute, value);
  }
  element.append(...children);
  return element;
}

/** Offers a text as a file to be saved. */
export function save(text, name, type) {
  const address = URL.createObjectURL(new Blob([text], { type }));
  const link = make("a", { href: address, download: name });
  link.click();
  // The browser reads it after the click.
  setTimeout(() => URL.revokeObjectURL(address), 10_000);
}

/**
 * Puts a text on the clipboard.
 *
 * @returns {Promise<boolean>} false where the browser does not let pages do so
 */
export async function copy(text) {
  try {
    await navigator.clipboard.writeText(text);
    return true;
  } catch {
    return false;
  }
}
