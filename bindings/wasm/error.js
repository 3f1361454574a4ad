// The error of this package.

/** What went wrong, in a sentence that says what cures it, and as a word in `code`. */
export class KzError extends Error {
  /**
   * @param {string} code   one of the words of KzErrorCode in index.d.ts
   * @param {string} message
   * @param {object} [details]  further properties of the error
   */
  constructor(code, message, details = {}) {
    super(message);
    this.name = "KzError";
    this.code = code;
    Object.assign(this, details);
  }
}
