// Hands a downloaded file to the browser, which saves it as `fileName`.
export function saveFile(blob, fileName) {
  const url = URL.createObjectURL(blob);
  const link = document.createElement('a');
  link.href = url;
  link.download = fileName;
  link.hidden = true;
  document.body.append(link);
  link.click();
  link.remove();
  // The browser has taken the file once the click is handled; the address is
  // kept a while longer for slow save dialogs.
  setTimeout(() => URL.revokeObjectURL(url), 60_000);
}
