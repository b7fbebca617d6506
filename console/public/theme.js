// Sets the theme before the first paint. A file of its own, because the content policy forbids inline scripts.
(function () {
  var chosen = localStorage.getItem('theme');
  var dark = chosen ? chosen === 'dark' : matchMedia('(prefers-color-scheme: dark)').matches;
  document.documentElement.classList.toggle('pf-v6-theme-dark', dark);
})();
