/** The error of this package; "kzsdk" exports it. */
export { KzError } from "./index.js";
export type { KzErrorCode } from "./index.js";
