# SPDX-License-Identifier: MIT
"""The tool speaks the user's language."""

import unittest

from orin_cli import Case, run, write_raster


class French(Case):
    def test_the_tools_own_texts(self):
        answer = run("build", LANGUAGE="fr")
        self.assertRan(answer, 2)
        self.assertEqual("orin-overviews: il faut un FILE (fichier)\n"
                         "Essayez : orin-overviews build --help\n", answer.stderr)
        self.assertIn("Reconstruire aussi les niveaux à jour",
                      run("build", "--help", LANGUAGE="fr").stdout)

    def test_the_librarys_texts(self):
        text = self.path("notes.txt", "pas un raster\n")
        answer = run("info", text, LANGUAGE="fr")
        self.assertRan(answer, 4)
        self.assertTrue(answer.stderr.startswith(
            f"orin-overviews: {text}: n'est pas un fichier raster d'un format connu."),
            answer.stderr)

    def test_errors_of_a_run(self):
        file = write_raster(self.path("scene.tif"), 600, 400)
        answer = run("build", file, "--levels", "1", LANGUAGE="fr")
        self.assertRan(answer, 2)
        self.assertIn("les niveaux sont des facteurs de réduction de 2 ou plus.", answer.stderr)

    def test_english_without_a_translation(self):
        self.assertIn("a FILE is needed", run("build", LANGUAGE="xx").stderr)
        self.assertIn("a FILE is needed", run("build", LC_ALL="C", LANGUAGE="fr").stderr)

    def test_translations_may_be_elsewhere(self):
        answer = run("build", LANGUAGE="fr", ORIN_LOCALE_DIR=self.folder)
        self.assertIn("a FILE is needed", answer.stderr)


if __name__ == "__main__":
    unittest.main()
